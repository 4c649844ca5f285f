#include "platform/tasks/module/TaskModule.h"

#include <sys/inotify.h>
#include <unistd.h>

#include <functional>

#include "platform/tasks/Id.h"
#include "platform/tasks/module/StoreConnection.h"
#include "webapi/Export.h"
#include "webapi/base/Log.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "TaskModule.cpp";

class DatabaseStores final : public TaskStores {
 public:
  explicit DatabaseStores(const TaskStoreSettings& settings) : settings_(settings) {}

  TaskResult Load(const TaskKey& key, TaskRecord& record) override;
  TaskResult Update(const TaskKey& key, const TaskProperties& properties) override {
    return Change(key, true,
                  [&](TaskDatabase& database) { return database.Update(key, properties); });
  }
  TaskResult SetProcess(const TaskKey& key, const ProcessIdentity& process) override {
    return Change(key, false,
                  [&](TaskDatabase& database) { return database.SetProcess(key, process); });
  }
  TaskResult Finish(const TaskKey& key) override {
    return Change(key, false, [&](TaskDatabase& database) { return database.Finish(key); });
  }
  TaskResult Remove(const TaskKey& key) override {
    return Change(key, false, [&](TaskDatabase& database) { return database.Remove(key); });
  }
  TaskResult List(const TaskQuery& query, std::vector<ListedTask>& tasks) override;
  std::vector<uid_t> Stores() override {
    return geteuid() == 0 ? listStores(settings_.directory) : std::vector<uid_t>{geteuid()};
  }
  UniqueFd Watch(uid_t store) override;

 private:
  using Use = StoreConnection::Use;

  TaskResult Change(const TaskKey& key, bool create,
                    const std::function<TaskResult(TaskDatabase&)>& operation);
  /// What a use of the store came to; failures are logged.
  TaskResult End(Use& use, uid_t store, TaskResult result) const;

  TaskStoreSettings settings_;
};

bool isSameProcess(const ProcessIdentity& left, const ProcessIdentity& right) {
  return left.pid == right.pid && left.start == right.start && left.boot == right.boot;
}

TaskResult DatabaseStores::Load(const TaskKey& key, TaskRecord& record) {
  Use use(StoreConnection::Get(), settings_, {key.store, key.patienceMs}, false);
  TaskResult result = use.State();
  if (result == TaskResult::kDone) {
    result = use.Database().Load(key, record);
  }
  const TaskEnding ending = result == TaskResult::kDone ? judgeTask(record) : record.ending;
  if (ending != record.ending) {
    const ProcessIdentity gone = record.process;
    if (use.Database().MarkEnded(key, gone, ending) == TaskResult::kDone) {
      use.Announce();
    }
    // Before it ended the process may have stored more, and said that it has finished.
    result = use.Database().Load(key, record);
    if (record.ending == TaskEnding::kRunning && isSameProcess(record.process, gone)) {
      record.ending = ending;
    }
  }
  return End(use, key.store, result);
}

TaskResult DatabaseStores::List(const TaskQuery& query, std::vector<ListedTask>& tasks) {
  Use use(StoreConnection::Get(), settings_, {query.store, query.patienceMs}, false);
  TaskResult result = use.State();
  if (result == TaskResult::kDone) {
    std::vector<ListedTask> found;
    result = use.Database().List(query, found);
    for (ListedTask& task : found) {
      uid_t named = 0;
      if (readTaskId(task.id, named) && named == query.store) {
        tasks.push_back(std::move(task));
      }
    }
  }
  return End(use, query.store, result);
}

UniqueFd DatabaseStores::Watch(uid_t store) {
  StoreDirectory directory;
  if (directory.Open(settings_.directory, store, false) != StoreDirectory::Result::kOpen) {
    return UniqueFd();
  }
  const FileUser rights(store, directory.Group());
  UniqueFd watch(inotify_init1(IN_CLOEXEC | IN_NONBLOCK));
  // A commit is announced by the directory's time. The database's own files are written before a
  // commit is there to be read.
  if (!rights.Good() || !watch ||
      inotify_add_watch(watch.Get(), directory.Path().c_str(),
                        IN_ATTRIB | IN_ONLYDIR | IN_DONT_FOLLOW) < 0) {
    return UniqueFd();
  }
  return watch;
}

TaskResult DatabaseStores::Change(const TaskKey& key, bool create,
                                  const std::function<TaskResult(TaskDatabase&)>& operation) {
  Use use(StoreConnection::Get(), settings_, {key.store, key.patienceMs}, create);
  TaskResult result = use.State();
  if (result == TaskResult::kDone) {
    result = operation(use.Database());
    if (result == TaskResult::kDone) {
      use.Announce();
    }
  }
  return End(use, key.store, result);
}

TaskResult DatabaseStores::End(Use& use, uid_t store, TaskResult result) const {
  if (result == TaskResult::kFailed || result == TaskResult::kBusy) {
    const bool opened = use.State() == TaskResult::kDone;
    WEBAPI_LOG(kSource, "cannot use the task store %s/%u [%s]", settings_.directory, store,
               opened ? use.Database().Error().c_str() : use.Error().c_str());
  }
  return result;
}

}  // namespace
}  // namespace QELO::Platform

extern "C" WEBAPI_API QELO::Platform::TaskStores* webapiTaskStores(
    const QELO::Platform::TaskStoreSettings* settings) {
  static QELO::Platform::TaskStores& stores = *new QELO::Platform::DatabaseStores(*settings);
  return &stores;
}
