#pragma once

#include <sys/types.h>

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "platform/tasks/ProcessIdentity.h"
#include "webapi/base/UniqueFd.h"

/// What the module of task records offers to the platform, which loads it.
namespace QELO::Platform {

/// How long one waits for a store that others hold, in milliseconds: one that is the caller's or
/// the system's own, and one of another user, who could hold it for ever.
inline constexpr int kOwnStoreMs = 5000;
inline constexpr int kForeignStoreMs = 100;

/// Names one record.
struct TaskKey {
  uid_t store = 0;    ///< the user whose store holds it
  std::string owner;  ///< any text
  std::string id;
  int patienceMs = kOwnStoreMs;  ///< longest wait for the store
};

enum class TaskEnding : int {
  kRunning = 0,
  kFinished = 1,      ///< somebody said so
  kProcessGone = 2,   ///< its process ended without saying so
  kNeverStarted = 3,  ///< no process was recorded in time
  kRestarted = 4      ///< the machine was started anew since
};

using TaskProperties = std::map<std::string, std::string>;  ///< name: JSON text

struct TaskRecord {
  TaskProperties properties;
  TaskEnding ending = TaskEnding::kRunning;
  ProcessIdentity process;
  int64_t born = 0;     ///< bootMilliseconds() when it was made
  int64_t version = 0;  ///< grows with every change
};

enum class TaskResult {
  kDone,
  kMissing,  ///< there is no such record
  kRemoved,  ///< there was one
  kFailed,   ///< the store cannot be used (logged)
  kBusy      ///< others hold the store (logged)
};

/// Which tasks of one store.
struct TaskQuery {
  uid_t store = 0;
  std::string owner;
  std::string prefix;    ///< of the ids; "": all
  bool unended = false;  ///< those alone that nobody has found ended yet
  int patienceMs = kOwnStoreMs;
};

struct ListedTask {
  std::string id;
  int64_t created = 0;  ///< milliseconds since the epoch
  int64_t row = 0;      ///< tells which of two in one store is older
};

struct TaskStoreSettings {
  const char* directory;  ///< parent of the stores; it and its own parent are made when missing
  int (*keepSeconds)();   ///< age at which ended tasks are cleared
};

/// The stores of all users below one directory, each a SQLite database in a directory that belongs
/// to that user alone. A process opens its own, that of its effective user; root opens any, with
/// that user's rights. Every change lands whole or not at all, whoever dies meanwhile.
class TaskStores {
 public:
  virtual ~TaskStores() = default;

  /// Reads a record. One that runs no longer without having been finished is told from its process,
  /// and that finding is stored.
  virtual TaskResult Load(const TaskKey& key, TaskRecord& record) = 0;
  /// Stores the properties, and makes the record when there was none.
  virtual TaskResult Update(const TaskKey& key, const TaskProperties& properties) = 0;
  /// Records the process that does the work. A task that was thought to have ended without being
  /// finished runs again.
  virtual TaskResult SetProcess(const TaskKey& key, const ProcessIdentity& process) = 0;
  virtual TaskResult Finish(const TaskKey& key) = 0;
  virtual TaskResult Remove(const TaskKey& key) = 0;
  /// Adds the tasks that are asked for, oldest first.
  virtual TaskResult List(const TaskQuery& query, std::vector<ListedTask>& tasks) = 0;
  /// The stores that the process may open.
  virtual std::vector<uid_t> Stores() = 0;
  /// A descriptor that becomes readable after every change in a store from now on; reading it does
  /// not block. @return none when the store is not there or cannot be watched
  virtual UniqueFd Watch(uid_t store) = 0;
};

/// Lives as long as the module, which is not unloaded.
using TaskStoresGet = TaskStores* (*)(const TaskStoreSettings* settings);

inline constexpr char kTaskModule[] = "tasks.so";
inline constexpr char kTaskStoresGet[] = "webapiTaskStores";

}  // namespace QELO::Platform
