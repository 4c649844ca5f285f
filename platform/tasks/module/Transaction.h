#pragma once

#include "platform/base/module/Statement.h"
#include "platform/tasks/module/TaskDatabase.h"

namespace QELO::Platform {

/// Holds the store's write lock from the start, so that nothing read in it is out of date when it
/// is written. Without Commit() all is undone.
class TaskDatabase::Transaction {
 public:
  explicit Transaction(TaskDatabase& database)
      : database_(database), begun_(Statement(database.Prepare("BEGIN IMMEDIATE")).Run()) {}
  ~Transaction() {
    if (begun_ && sqlite3_get_autocommit(database_.database_.get()) == 0) {
      Statement(database_.Prepare("ROLLBACK")).Run();
    }
  }
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;

  bool Begun() const { return begun_; }
  bool Commit() { return Statement(database_.Prepare("COMMIT")).Run(); }

 private:
  TaskDatabase& database_;
  bool begun_;
};

}  // namespace QELO::Platform
