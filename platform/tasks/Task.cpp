#include "webapi/platform/Task.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <functional>

#include "platform/tasks/Access.h"
#include "platform/tasks/Values.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"

using namespace QELO;
using Platform::TaskEnding;
using Platform::TaskKey;
using Platform::TaskProperties;
using Platform::TaskRecord;
using Platform::TaskResult;
using Platform::TaskStores;

namespace ARDO {

struct TaskPrivate {
  enum class Read { kNot, kThere, kMissing };

  std::string owner;
  std::string id;
  bool updating = false;
  bool refused = false;  ///< a value of the update cannot be stored
  TaskProperties pending;
  Read read = Read::kNot;
  bool busy = false;      ///< the last read found the store busy
  bool wasThere = false;  ///< the record was seen or stored by this object
  TaskRecord record;

  /// Runs an operation of the stores on the record. @return kMissing when it cannot be reached
  TaskResult Run(const std::function<TaskResult(TaskStores&, const TaskKey&)>& operation) const;
  /// Runs one that changes the record; what was read of it is then out of date.
  bool Change(const std::function<TaskResult(TaskStores&, const TaskKey&)>& operation);
  bool Load();
  bool EnsureLoaded();
  bool IsFinished() const { return record.ending != TaskEnding::kRunning; }
  UniqueFd Watch() const;
};

namespace {

constexpr int kUnitMs = 10;      // of a limit
constexpr int kRecheckMs = 100;  // a process's death is seen by looking alone
constexpr int kUnwatchedMs = 5;  // between looks without a watch

int64_t deadlineAfter(int limit) {
  const int64_t now = Platform::bootMilliseconds();
  // The millisecond that has begun is not counted: a wait never ends early.
  return limit > 0 ? now + static_cast<int64_t>(limit) * kUnitMs + 1 : now;
}

/// @return false when the deadline has passed
bool sleepUntilChange(const UniqueFd& watch, int64_t deadline) {
  const int64_t left = deadline - Platform::bootMilliseconds();
  if (left <= 0) {
    return false;
  }
  pollfd change{watch.Get(), POLLIN, 0};
  const int64_t pause = std::min<int64_t>(left, watch ? kRecheckMs : kUnwatchedMs);
  if (poll(&change, watch ? 1 : 0, static_cast<int>(pause)) > 0) {
    char events[4096];
    while (read(watch.Get(), events, sizeof events) > 0) {
    }
  }
  return true;
}

}  // namespace

TaskResult TaskPrivate::Run(
    const std::function<TaskResult(TaskStores&, const TaskKey&)>& operation) const {
  TaskKey key;
  if (!Platform::makeTaskKey(owner, id, key)) {
    return TaskResult::kMissing;
  }
  TaskStores* stores = Platform::openTaskStores();
  return stores != nullptr ? operation(*stores, key) : TaskResult::kFailed;
}

bool TaskPrivate::Change(const std::function<TaskResult(TaskStores&, const TaskKey&)>& operation) {
  read = Read::kNot;
  const bool done = Run(operation) == TaskResult::kDone;
  wasThere = wasThere || done;
  return done;
}

bool TaskPrivate::Load() {
  const TaskResult result =
      Run([&](TaskStores& stores, const TaskKey& key) { return stores.Load(key, record); });
  if (result != TaskResult::kDone) {
    record = {};
  }
  read = result == TaskResult::kDone ? Read::kThere : Read::kMissing;
  busy = result == TaskResult::kBusy;
  wasThere = wasThere || read == Read::kThere;
  return read == Read::kThere;
}

bool TaskPrivate::EnsureLoaded() {
  return read == Read::kNot ? Load() : read == Read::kThere;
}

UniqueFd TaskPrivate::Watch() const {
  UniqueFd watch;
  Run([&](TaskStores& stores, const TaskKey& key) {
    watch = stores.Watch(key.store);
    return TaskResult::kDone;
  });
  return watch;
}

Task::Task(const std::string& owner, const std::string& taskId)
    : private_(std::make_unique<TaskPrivate>()) {
  private_->owner = owner;
  private_->id = taskId;
}

Task::~Task() = default;

void Task::beginUpdate() {
  private_->updating = true;
  private_->refused = false;
  private_->pending.clear();
}

bool Task::setProperty(const std::string& name, const Json::Value& value) {
  if (!private_->updating) {
    beginUpdate();
    return setProperty(name, value) && endUpdate();
  }
  std::string text;
  if (!Platform::isTaskPropertyName(name) || !Platform::writeTaskValue(value, text)) {
    WEBAPI_LOG("Task.cpp", "a task's property is not stored: %s",
               text.empty() && Platform::isTaskPropertyName(name) ? "its value nests too deep"
                                                                  : "its name cannot be one");
    private_->refused = true;
    return false;
  }
  private_->pending[name] = std::move(text);
  return true;
}

bool Task::endUpdate() {
  const TaskProperties properties = std::move(private_->pending);
  const bool storable = private_->updating && !private_->refused && !properties.empty();
  private_->pending.clear();
  private_->updating = false;
  return storable && private_->Change([&](TaskStores& stores, const TaskKey& key) {
    return stores.Update(key, properties);
  });
}

Json::Value Task::getProperty(const std::string& name) const {
  Json::Value value;
  if (!private_->EnsureLoaded()) {
    return value;
  }
  if (name == Platform::kTaskBody && Platform::hasTaskFailed(private_->record.ending)) {
    return Platform::makeTaskErrorBody(private_->record.ending);
  }
  const auto found = private_->record.properties.find(name);
  if (found != private_->record.properties.end()) {
    JsonHelper::fromString(found->second, value);
  }
  return value;
}

bool Task::hasProperty(const std::string& name) const {
  if (!private_->EnsureLoaded()) {
    return false;
  }
  return private_->record.properties.count(name) > 0 ||
         (name == Platform::kTaskBody && Platform::hasTaskFailed(private_->record.ending));
}

bool Task::getBoolProperty(const std::string& name, bool def) const {
  return JsonHelper::asBool(getProperty(name), def);
}

bool Task::isFinished() const {
  return private_->EnsureLoaded() && private_->IsFinished();
}

bool Task::finish(bool removeRecord) {
  if (removeRecord) {
    return remove();
  }
  return private_->Change(
      [](TaskStores& stores, const TaskKey& key) { return stores.Finish(key); });
}

bool Task::remove() {
  return private_->Change(
      [](TaskStores& stores, const TaskKey& key) { return stores.Remove(key); });
}

bool Task::reload() {
  return private_->Load();
}

bool Task::isBusy() const {
  return private_->busy;
}

bool Task::setCreatePid(int pid) {
  Platform::ProcessIdentity process;
  return Platform::identifyProcess(pid, process) &&
         private_->Change([&](TaskStores& stores, const TaskKey& key) {
           return stores.SetProcess(key, process);
         });
}

int Task::getCreatePid() const {
  TaskKey key;
  if (!private_->EnsureLoaded() || !Platform::makeTaskKey(private_->owner, private_->id, key)) {
    return 0;
  }
  const Platform::ProcessIdentity& process = private_->record.process;
  // The record's user may have written it, so it stands for that user's processes alone.
  const bool ours = process.boot == Platform::readBootId() &&
                    Platform::findProcess(process) == Platform::ProcessState::kRunning &&
                    Platform::processBelongsTo(process.pid, key.store);
  return ours ? process.pid : 0;
}

std::string Task::getTaskId() const {
  return private_->id;
}

bool Task::waitForDataReady(const std::string& name, int limit) {
  const int64_t deadline = deadlineAfter(limit);
  const UniqueFd watch = private_->Watch();  // before the first look, so that no change is missed
  while (true) {
    const bool there = private_->Load();
    if (there && private_->record.properties.count(name) > 0) {
      return true;
    }
    const bool over = there ? private_->IsFinished() : private_->wasThere && !private_->busy;
    if (over || !sleepUntilChange(watch, deadline)) {
      return false;
    }
  }
}

bool Task::waitForChange(int limit) {
  const int64_t deadline = deadlineAfter(limit);
  const UniqueFd watch = private_->Watch();
  const bool before = private_->EnsureLoaded();
  const int64_t version = private_->record.version;
  const TaskEnding ending = private_->record.ending;
  while (true) {
    const bool there = private_->Load();
    const bool changed =
        there != before || private_->record.version != version || private_->record.ending != ending;
    if (changed && !private_->busy) {
      return true;
    }
    if (!sleepUntilChange(watch, deadline)) {
      return false;
    }
  }
}

}  // namespace ARDO
