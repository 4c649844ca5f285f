#include "platform/tasks/module/StoreConnection.h"

#include <sys/stat.h>
#include <unistd.h>

namespace QELO::Platform {

StoreConnection& StoreConnection::Get() {
  // Never destroyed: what runs at the process's end may still store a result.
  static StoreConnection& connection = *new StoreConnection;
  return connection;
}

StoreConnection::StoreConnection() {
  pthread_atfork(BeforeFork, AfterFork, AfterFork);
}

void StoreConnection::BeforeFork() {
  StoreConnection& connection = Get();
  connection.forking_ = connection.Enter();
  if (connection.forking_ && connection.process_ == getpid()) {
    connection.Drop();
  }
}

void StoreConnection::AfterFork() {
  StoreConnection& connection = Get();
  if (connection.forking_) {
    connection.forking_ = false;
    connection.Leave();
  }
}

bool StoreConnection::Enter() {
  if (user_ == pthread_self()) {
    return false;  // a signal's handler, in the midst of an operation
  }
  mutex_.lock();
  user_ = pthread_self();
  return true;
}

void StoreConnection::Leave() {
  user_ = 0;
  mutex_.unlock();
}

void StoreConnection::Drop() {
  database_.reset();
  directory_ = {};
}

StoreConnection::Use::Use(StoreConnection& connection, const TaskStoreSettings& settings,
                          const Wanted& wanted, bool create)
    : connection_(connection), entered_(connection.Enter()) {
  if (entered_) {
    patience_.emplace(wanted.patienceMs);
  }
  if (!entered_) {
    error_ = "an operation is under way";
  } else if (connection_.database_ && connection_.process_ != getpid()) {
    error_ = "the connection belongs to a parent process";
  } else if (connection_.database_ && connection_.store_ == wanted.store &&
             findDatabaseFile(connection_.directory_) == connection_.file_) {
    connection_.database_->SetPatience(wanted.patienceMs);
    state_ = TakeRights(wanted.store, connection_.directory_.Group()) ? TaskResult::kDone
                                                                      : TaskResult::kFailed;
  } else {
    Open(settings, wanted, create);
  }
}

StoreConnection::Use::~Use() {
  rights_.reset();
  patience_.reset();
  if (entered_) {
    connection_.Leave();
  }
}

void StoreConnection::Use::Open(const TaskStoreSettings& settings, const Wanted& wanted,
                                bool create) {
  const uid_t store = wanted.store;
  connection_.Drop();
  StoreDirectory directory;
  const StoreDirectory::Result opened = directory.Open(settings.directory, store, create);
  if (opened != StoreDirectory::Result::kOpen) {
    state_ =
        opened == StoreDirectory::Result::kMissing ? TaskResult::kMissing : TaskResult::kFailed;
    error_ = directory.Error();
    return;
  }
  if (!TakeRights(store, directory.Group())) {
    return;
  }
  sqlite3* database = openTaskDatabase(directory, store, create, state_, error_);
  if (database == nullptr) {
    return;
  }
  connection_.process_ = getpid();
  connection_.store_ = store;
  connection_.file_ = findDatabaseFile(directory);
  connection_.directory_ = std::move(directory);
  connection_.database_ = std::make_unique<TaskDatabase>(database, settings.keepSeconds);
  connection_.database_->SetPatience(wanted.patienceMs);
  state_ = TaskResult::kDone;
}

bool StoreConnection::Use::TakeRights(uid_t store, gid_t group) {
  rights_.emplace(store, group);
  if (!rights_->Good()) {
    error_ = "the user's rights cannot be taken";
  }
  return rights_->Good();
}

void StoreConnection::Use::Announce() {
  futimens(connection_.directory_.Fd(), nullptr);
}

}  // namespace QELO::Platform
