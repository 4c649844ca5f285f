#pragma once

#include <pthread.h>

#include <atomic>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "platform/tasks/module/FileUser.h"
#include "platform/tasks/module/Patience.h"
#include "platform/tasks/module/StoreDirectory.h"
#include "platform/tasks/module/TaskDatabase.h"
#include "platform/tasks/module/TaskSchema.h"

namespace QELO::Platform {

/// The process's connection to the store that it used last; there is one, since SQLite keeps what
/// it knows of a file for the process as a whole.
///
/// That is also why the connection is closed when the process forks: a child would take locks for
/// its own that its parent holds, with a connection that it opens itself too.
class StoreConnection {
 public:
  static StoreConnection& Get();

  /// Which store, and how long to wait for it.
  struct Wanted {
    uid_t store;
    int patienceMs;
  };

  /// Uses the connection while it lives, with the rights of the store's user, and keeps other
  /// threads and forks waiting.
  class Use {
   public:
    /// @param create  makes the store when missing, if it is the effective user's own
    Use(StoreConnection& connection, const TaskStoreSettings& settings, const Wanted& wanted,
        bool create);
    ~Use();
    Use(const Use&) = delete;
    Use& operator=(const Use&) = delete;

    /// kDone: Database() can be used; kMissing: there is no store; kFailed, kBusy: see Error().
    TaskResult State() const { return state_; }
    TaskDatabase& Database() { return *connection_.database_; }
    /// Tells those who watch the store that it has changed.
    void Announce();
    const std::string& Error() const { return error_; }

   private:
    void Open(const TaskStoreSettings& settings, const Wanted& wanted, bool create);
    bool TakeRights(uid_t store, gid_t group);

    StoreConnection& connection_;
    bool entered_;
    std::optional<Patience> patience_;
    std::optional<FileUser> rights_;
    TaskResult state_ = TaskResult::kFailed;
    std::string error_;
  };

 private:
  StoreConnection();

  bool Enter();
  void Leave();
  void Drop();
  static void BeforeFork();
  static void AfterFork();

  std::mutex mutex_;
  std::atomic<pthread_t> user_{};  ///< the thread that uses the connection; 0: none
  bool forking_ = false;
  pid_t process_ = 0;  ///< which opened the database
  uid_t store_ = 0;
  StoreDirectory directory_;
  DatabaseFile file_;
  std::unique_ptr<TaskDatabase> database_;
};

}  // namespace QELO::Platform
