#include "tests/support/FakeTask.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "webapi/JsonHelper.h"
#include "webapi/platform/Task.h"
#include "webapi/platform/WebAPIUtil.h"

using QELO::JsonHelper::asBool;
using QELO::JsonHelper::asInt;
using QELO::JsonHelper::hasMember;
using QELO::JsonHelper::member;

namespace {

constexpr useconds_t kLookPauseUs = 1000;
constexpr int kLooksPerUnit = 10;  ///< pauses in the 10 ms of a unit

/// Removes the records of all tests when the test program itself ends.
struct Directory {
  std::string path;
  pid_t owner = getpid();
  Directory() {
    std::string pattern = std::filesystem::temp_directory_path() / "tasks.XXXXXX";
    path = mkdtemp(pattern.data());
  }
  ~Directory() {
    if (getpid() == owner) {
      std::error_code error;
      std::filesystem::remove_all(path, error);
    }
  }
};

/// One process at a time.
class Lock {
 public:
  explicit Lock(const std::string& directory)
      : fd_(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
    flock(fd_, LOCK_EX);
  }
  Lock(const Lock&) = delete;
  Lock& operator=(const Lock&) = delete;
  ~Lock() { close(fd_); }

 private:
  int fd_;
};

std::string fileOf(const std::string& directory, const std::string& owner,
                   const std::string& taskId) {
  return directory + "/" + QELO::WebAPIUtil::URLEncode(owner + "/" + taskId);
}

/// What is left of a record that was removed: an update does not make it again.
std::string removedFileOf(const std::string& directory, const std::string& owner,
                          const std::string& taskId) {
  return directory + "/removed/" + QELO::WebAPIUtil::URLEncode(owner + "/" + taskId);
}

/// Alive, and not merely waiting to be collected by its parent.
bool isAlive(int pid) {
  std::ifstream stat("/proc/" + std::to_string(pid) + "/stat");
  std::string text;
  std::getline(stat, text);
  const size_t name = text.rfind(") ");
  return name != std::string::npos && text[name + 2] != 'Z';
}

void passTime(const std::string& operation) {
  if (FakeTask::Get().meanwhile) {
    FakeTask::Get().meanwhile(operation);
  }
}

void note(const std::string& call) {
  FakeTask::Get().calls.push_back(call);
}

void noteStep(const std::string& step) {
  FakeTask::Get().updateSteps.push_back(step);
}

}  // namespace

FakeTask& FakeTask::Get() {
  static FakeTask instance;
  return instance;
}

FakeTask& FakeTask::Reset() {
  static Directory all;
  static int count = 0;
  FakeTask& fake = Get();
  fake = FakeTask();
  fake.directory = all.path + "/" + std::to_string(++count);
  std::filesystem::create_directories(fake.directory + "/removed");
  return fake;
}

Json::Value FakeTask::Record(const std::string& owner, const std::string& taskId) const {
  Json::Value record;
  QELO::JsonHelper::fromFile(fileOf(directory, owner, taskId), record);
  return record;
}

void FakeTask::Put(const std::string& owner, const std::string& taskId,
                   const Json::Value& record) const {
  const std::string file = fileOf(directory, owner, taskId);
  const Lock lock(directory);
  if (record.isNull()) {
    rename(file.c_str(), removedFileOf(directory, owner, taskId).c_str());
  } else {
    QELO::JsonHelper::toFile(file, record);
  }
}

bool FakeTask::Change(const std::string& owner, const std::string& taskId, bool create,
                      const std::function<void(Json::Value&)>& change) const {
  const std::string file = fileOf(directory, owner, taskId);
  const Lock lock(directory);
  Json::Value record(Json::objectValue);
  if (!QELO::JsonHelper::fromFile(file, record) && !create) {
    return false;
  }
  change(record);
  return QELO::JsonHelper::toFile(file, record);
}

std::vector<std::string> FakeTask::Ids(const std::string& owner) const {
  const std::string front = QELO::WebAPIUtil::URLEncode(owner + "/");
  std::vector<std::string> ids;
  for (const auto& entry : std::filesystem::directory_iterator(directory)) {
    const std::string name = entry.path().filename();
    if (name.rfind(front, 0) == 0) {
      ids.push_back(QELO::WebAPIUtil::URLDecode(name.substr(front.size()), false));
    }
  }
  std::sort(ids.begin(), ids.end());
  return ids;
}

namespace ARDO {

struct TaskPrivate {
  std::string owner;
  std::string id;
  Json::Value record;
  Json::Value pending;
  bool updating = false;
};

Task::Task(const std::string& owner, const std::string& taskId)
    : private_(std::make_unique<TaskPrivate>()) {
  note("Task(" + owner + ", " + taskId + ")");
  private_->owner = owner;
  private_->id = taskId;
  reload();
}

Task::~Task() = default;

void Task::beginUpdate() {
  noteStep("beginUpdate");
  private_->updating = true;
  private_->pending = Json::Value(Json::objectValue);
}

bool Task::setProperty(const std::string& name, const Json::Value& value) {
  const bool single = !private_->updating;
  if (single) {
    beginUpdate();
  }
  noteStep("setProperty(" + name + ")");
  private_->pending[name] = value;
  return !single || endUpdate();
}

bool Task::endUpdate() {
  noteStep("endUpdate");
  const std::string text = QELO::JsonHelper::toString(private_->pending);
  note("endUpdate(" + text + ")");
  private_->updating = false;
  if (!FakeTask::Get().endUpdate || text.size() > FakeTask::Get().largestUpdate) {
    return false;
  }
  const bool isNew =
      access(removedFileOf(FakeTask::Get().directory, private_->owner, private_->id).c_str(),
             F_OK) != 0;
  const bool stored =
      FakeTask::Get().Change(private_->owner, private_->id, isNew, [&](Json::Value& record) {
        for (const std::string& name : private_->pending.getMemberNames()) {
          record["properties"][name] = private_->pending[name];
        }
      });
  const bool there = stored && reload();
  passTime("endUpdate");
  return there;
}

Json::Value Task::getProperty(const std::string& name) const {
  return member(member(private_->record, "properties"), name);
}

bool Task::hasProperty(const std::string& name) const {
  return hasMember(member(private_->record, "properties"), name);
}

bool Task::getBoolProperty(const std::string& name, bool def) const {
  return asBool(getProperty(name), def);
}

bool Task::isFinished() const {
  const int pid = asInt(member(private_->record, "pid"));
  return asBool(member(private_->record, "finished")) || (pid > 0 && !isAlive(pid));
}

bool Task::finish(bool remove_) {
  note(std::string("finish(") + (remove_ ? "true" : "false") + ")");
  if (!FakeTask::Get().finish) {
    return false;
  }
  const bool stored = FakeTask::Get().Change(
      private_->owner, private_->id, false, [](Json::Value& record) { record["finished"] = true; });
  return stored && (!remove_ || remove());
}

bool Task::remove() {
  note("remove()");
  const bool existed = !FakeTask::Get().Record(private_->owner, private_->id).isNull();
  FakeTask::Get().Put(private_->owner, private_->id, Json::Value());
  return existed;
}

bool Task::reload() {
  private_->record =
      FakeTask::Get().busy ? Json::Value() : FakeTask::Get().Record(private_->owner, private_->id);
  return !private_->record.isNull();
}

bool Task::isBusy() const {
  return FakeTask::Get().busy && private_->record.isNull();
}

bool Task::setCreatePid(int pid) {
  passTime("setCreatePid");
  return FakeTask::Get().setCreatePid &&
         FakeTask::Get().Change(private_->owner, private_->id, false,
                                [&](Json::Value& record) { record["pid"] = pid; });
}

int Task::getCreatePid() const {
  const int pid = asInt(member(private_->record, "pid"));
  const bool isTold = pid > 0 && (FakeTask::Get().tellDead || isAlive(pid));
  passTime("getCreatePid");
  return isTold ? pid : 0;
}

std::string Task::getTaskId() const {
  return private_->id;
}

bool Task::waitForDataReady(const std::string& name, int limit) {
  note("waitForDataReady(" + name + ", " + std::to_string(limit) + ")");
  for (int look = 0; look < limit * kLooksPerUnit && !hasProperty(name); ++look) {
    usleep(kLookPauseUs);
    if (!reload()) {
      return false;
    }
  }
  return hasProperty(name);
}

bool Task::waitForChange(int limit) {
  note("waitForChange(" + std::to_string(limit) + ")");
  const bool ended = isFinished();
  for (int look = 0; look < limit * kLooksPerUnit; ++look) {
    const Json::Value before = private_->record;
    reload();
    if (private_->record != before || isFinished() != ended) {
      return true;
    }
    usleep(kLookPauseUs);
  }
  return false;
}

TaskMgr::TaskMgr(const std::string& owner) : owner_(owner) {}

Json::Value TaskMgr::getUnendedTaskId(const char* prefix) {
  const Json::Value all = getAllTaskId(prefix);
  Json::Value ids(Json::arrayValue);
  for (const Json::Value& id : all) {
    if (!asBool(member(FakeTask::Get().Record(owner_, id.asString()), "finished"))) {
      ids.append(id);
    }
  }
  return ids;
}

Json::Value TaskMgr::getAllTaskId(const char* prefix) {
  isIncomplete_ = FakeTask::Get().busy;
  note("getAllTaskId(" + owner_ + ", " + (prefix != nullptr ? prefix : "null") + ")");
  Json::Value ids(Json::arrayValue);
  for (const std::string& id : FakeTask::Get().Ids(owner_)) {
    if (!isIncomplete_ && (prefix == nullptr || id.rfind(prefix, 0) == 0)) {
      ids.append(id);
    }
  }
  return ids;
}

std::string TaskUtil::getUniqueID(const std::string& owner, const std::string& prefix) {
  note("getUniqueID(" + owner + ", " + prefix + ")");
  return prefix + FakeTask::Get().nextId;
}

bool TaskUtil::checkTaskExists(const std::string& owner, const std::string& taskId) {
  const bool exists = !FakeTask::Get().busy && !FakeTask::Get().Record(owner, taskId).isNull();
  passTime("checkTaskExists");
  return exists;
}

}  // namespace ARDO
