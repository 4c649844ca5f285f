#pragma once

#include "platform/base/module/OwnDatabase.h"
#include "platform/base/module/Statement.h"
#include "platform/sharing/module/SqliteLinkStore.h"

namespace QELO::Platform {

/// Holds the write lock from the start, so that nothing read in it is out of date when it is
/// written. Without Commit() all is undone.
class SqliteLinkStore::Transaction {
 public:
  explicit Transaction(SqliteLinkStore& store)
      : store_(store), begun_(Statement(store.Prepare("BEGIN IMMEDIATE")).Run()) {}
  ~Transaction() {
    if (begun_ && sqlite3_get_autocommit(store_.database_) == 0) {
      const std::string reason = store_.error_;
      Statement(store_.Prepare("ROLLBACK")).Run();
      store_.error_ = reason;
    }
  }
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;

  bool Begun() const { return begun_; }
  bool Commit() {
    if (!Statement(store_.Prepare("COMMIT")).Run()) {
      return false;
    }
    emptyDatabaseLog(store_.database_);
    return true;
  }

 private:
  SqliteLinkStore& store_;
  bool begun_;
};

}  // namespace QELO::Platform
