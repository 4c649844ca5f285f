#pragma once

#include <sqlite3.h>

#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "platform/tasks/module/TaskModule.h"

namespace QELO::Platform {

/// One connection to the records of one store. It must not be used by a child of the process that
/// made it, nor be open when that process forks.
///
/// Every operation is a transaction of its own; Error() tells why one returned kFailed or kBusy.
class TaskDatabase {
 public:
  /// Most bytes that the properties of one record may hold.
  static constexpr int64_t kLargestRecord = 64 << 20;
  /// Most ids that a list holds.
  static constexpr int kMostListed = 100'000;

  using KeepSeconds = int (*)();

  /// @param database     taken over
  /// @param keepSeconds  asked when a record is made or records are listed: those that ended longer
  ///                     ago are then cleared
  TaskDatabase(sqlite3* database, KeepSeconds keepSeconds);
  TaskDatabase(const TaskDatabase&) = delete;
  TaskDatabase& operator=(const TaskDatabase&) = delete;

  TaskResult Load(const TaskKey& key, TaskRecord& record);
  TaskResult Update(const TaskKey& key, const TaskProperties& properties);
  TaskResult SetProcess(const TaskKey& key, const ProcessIdentity& process);
  TaskResult Finish(const TaskKey& key);
  /// Stores how the task ended, unless it has another process or ended otherwise meanwhile.
  TaskResult MarkEnded(const TaskKey& key, const ProcessIdentity& process, TaskEnding ending);
  TaskResult Remove(const TaskKey& key);
  /// Clears first, unless others are writing.
  /// @param tasks  receives the tasks, oldest first, when it is empty
  TaskResult List(const TaskQuery& query, std::vector<ListedTask>& tasks);

  /// How long it waits for others from now on.
  void SetPatience(int milliseconds);

  const std::string& Error() const { return error_; }

 private:
  class Transaction;
  struct Close {
    void operator()(sqlite3* database) const { sqlite3_close(database); }
  };
  struct Finalize {
    void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
  };

  /// The statement is kept for its next use; the text must be a constant.
  sqlite3_stmt* Prepare(const char* sql);
  TaskResult Find(const TaskKey& key, int64_t& row);
  TaskResult Create(const TaskKey& key, int64_t& row);
  bool Put(int64_t row, const TaskProperties& properties);
  bool Erase(int64_t row);
  struct Forgotten {
    int64_t row;
    TaskEnding ending;
    int64_t time;  ///< of the last sign of life
  };

  bool Clear(int64_t now);
  /// Clears when there is something to clear.
  void Tidy();
  bool HasEnded(int64_t before);
  /// Some of the tasks that were made before and died while nobody asked for them.
  bool FindForgotten(int64_t before, std::vector<Forgotten>& forgotten);
  bool EndForgotten(const std::vector<Forgotten>& forgotten);
  bool ClearEnded(int64_t before);
  bool ClearRemoved(int64_t before);
  /// What the last statement did to the record that it named.
  TaskResult Changed(bool run);
  TaskResult Fail();

  std::unique_ptr<sqlite3, Close> database_;
  KeepSeconds keepSeconds_;
  int patienceMs_ = 0;
  std::unordered_map<const char*, std::unique_ptr<sqlite3_stmt, Finalize>> statements_;
  std::string error_;
};

/// How a task stands by what its process and this boot tell now.
TaskEnding judgeTask(const TaskRecord& record);

/// Milliseconds since the epoch.
int64_t currentMilliseconds();

}  // namespace QELO::Platform
