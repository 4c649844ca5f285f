// What clients do with background tasks that were started before: status, wait, stop, list.

#include <errno.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstring>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/batch/polling/APIPollingPrivate.h"
#include "webapi/batch/polling/HeldProcess.h"
#include "webapi/batch/polling/Terms.h"
#include "webapi/platform/Task.h"

namespace QELO {
namespace {

/// Names what a client sees change of a task: 64 bits of its body and end (FNV-1a).
std::string stateOf(const Json::Value& status) {
  Json::Value seen = status;
  seen.removeMember("info");
  uint64_t hash = 14695981039346656037ULL;
  for (const char c : JsonHelper::toString(seen)) {
    hash = (hash ^ static_cast<unsigned char>(c)) * 1099511628211ULL;
  }
  char text[17];
  snprintf(text, sizeof text, "%016llx", static_cast<unsigned long long>(hash));
  return text;
}

/// Whole units of 10 ms until then, rounded up.
int unitsUntil(std::chrono::steady_clock::time_point end) {
  using Unit = std::chrono::duration<int64_t, std::centi>;
  const auto left = std::chrono::ceil<Unit>(end - std::chrono::steady_clock::now()).count();
  return static_cast<int>(std::max<int64_t>(left, 0));
}

}  // namespace

APIPollingPrivate::APIPollingPrivate(APIRequest* request, APIPolling* owner)
    : request_(request), owner_(owner), error_(POLLING_ERR_UNKNOWN) {
  InitField("polling_attribute");
}

bool APIPollingPrivate::Fail(int code) {
  error_ = code;
  return false;
}

bool APIPollingPrivate::HasRequest() {
  if (request_ == nullptr) {
    WEBAPI_LOG(kPollingSource, "unknown request");
    return Fail(POLLING_ERR_BAD_PARAMETERS);
  }
  return true;
}

std::string APIPollingPrivate::LoginUser() const {
  return request_ != nullptr ? request_->GetLoginUserName() : "";
}

bool APIPollingPrivate::IsAdmin() const {
  return request_ != nullptr && request_->IsAdmin();
}

bool APIPollingPrivate::GetUserAndTaskID(const std::string& fullId, std::string& owner,
                                         std::string& taskId) const {
  const size_t slash = fullId.find('/');
  if (slash == std::string::npos) {
    return false;
  }
  owner = fullId.substr(0, slash);
  taskId = fullId.substr(slash + 1);
  return true;
}

bool APIPollingPrivate::CheckTaskUser(const std::string& owner) const {
  // Who is not logged in has no tasks, not those of a nameless owner.
  if (owner == kEverybodyOwner || (!owner.empty() && owner == LoginUser())) {
    return true;
  }
  if (owner == kAdministratorsOwner) {
    if (!IsAdmin()) {
      WEBAPI_LOG(kPollingSource, "Permission denied");
    }
    return IsAdmin();
  }
  WEBAPI_LOG(kPollingSource, "Invalid task id");
  return false;
}

bool APIPollingPrivate::DoKill(pid_t pid, const std::function<bool()>& isStill) const {
  if (pid < 1) {
    WEBAPI_LOG(kPollingSource, "invalid process id");
    return false;
  }
  const HeldProcess process(pid);
  if (isStill && !isStill()) {
    return true;
  }
  const int error = process.Terminate();
  if (error == 0 || error == ESRCH) {
    return true;
  }
  WEBAPI_LOG(kPollingSource, "Failed to kill %d, reason=%s(%d)", pid, strerror(error), error);
  return false;
}

Json::Value APIPollingPrivate::ConverToFullTaskId(const std::string& owner,
                                                  const Json::Value& ids) const {
  if (owner.empty() || ids.empty()) {
    return Json::Value();
  }
  const std::string front = owner + "/";
  if (ids.isString()) {
    return front + ids.asString();
  }
  Json::Value fullIds;
  if (ids.isObject()) {
    for (auto it = ids.begin(); it != ids.end(); ++it) {
      fullIds[it.name()] = front + JsonHelper::asString(*it);
    }
  } else if (ids.isArray()) {
    for (const Json::Value& id : ids) {
      fullIds.append(front + JsonHelper::asString(id));
    }
  }
  return fullIds;
}

Json::Value APIPollingPrivate::StatusOf(const ARDO::Task& task) const {
  Json::Value status = task.getProperty("body");
  if (!status.isObject()) {  // no result yet
    status = Json::Value(Json::objectValue);
  }
  status["finish"] = task.isFinished();
  status["auto_remove"] = task.getProperty("auto_remove");
  if (task.hasProperty("info")) {
    status["info"] = task.getProperty("info");
  }
  return status;
}

std::unique_ptr<ARDO::Task> APIPollingPrivate::LoadTask(const std::string& owner,
                                                        const std::string& taskId) {
  if (!ARDO::TaskUtil::checkTaskExists(owner, taskId)) {
    return nullptr;
  }
  auto task = std::make_unique<ARDO::Task>(owner, taskId);
  // It may have removed itself since, and what is not there would look as if it ran.
  return task->reload() ? std::move(task) : nullptr;
}

bool APIPollingPrivate::FailMissing(const std::string& fullId) {
  WEBAPI_LOG(kPollingSource, "No such task id[%s]", LogText(fullId).c_str());
  return Fail(POLLING_ERR_NO_SUCH_TASK);
}

std::unique_ptr<ARDO::Task> APIPollingPrivate::FindTask(const std::string& fullId) {
  std::string owner;
  std::string taskId;
  if (!HasRequest()) {
    return nullptr;
  }
  if (fullId.empty()) {
    WEBAPI_LOG(kPollingSource, "bad parameters");
    Fail(POLLING_ERR_BAD_PARAMETERS);
    return nullptr;
  }
  if (!GetUserAndTaskID(fullId, owner, taskId) || !CheckTaskUser(owner)) {
    WEBAPI_LOG(kPollingSource, "Invalid task id[%s]", LogText(fullId).c_str());
    Fail(POLLING_ERR_INVALID_ID);
    return nullptr;
  }
  std::unique_ptr<ARDO::Task> task = LoadTask(owner, taskId);
  if (task == nullptr) {
    FailMissing(fullId);
  }
  return task;
}

bool APIPollingPrivate::Status(const std::string& fullId, Json::Value& out) {
  const std::unique_ptr<ARDO::Task> task = FindTask(fullId);
  if (task == nullptr) {
    return false;
  }
  out = StatusOf(*task);
  return true;
}

bool APIPollingPrivate::Status(const Json::Value& fullIds, Json::Value& out) {
  if (!HasRequest()) {
    return false;
  }
  if (!fullIds.isArray()) {
    WEBAPI_LOG(kPollingSource, "bad parameters");
    return Fail(POLLING_ERR_BAD_PARAMETERS);
  }
  Json::Value all(Json::objectValue);
  for (const Json::Value& entry : fullIds) {
    const std::string fullId = JsonHelper::asString(entry);
    Json::Value& status = all[fullId] = Json::Value(Json::objectValue);
    std::string owner;
    std::string taskId;
    if (!GetUserAndTaskID(fullId, owner, taskId) || !CheckTaskUser(owner)) {
      WEBAPI_LOG(kPollingSource, "Invalid task id[%s]", LogText(fullId).c_str());
    } else if (const std::unique_ptr<ARDO::Task> task = LoadTask(owner, taskId)) {
      status = StatusOf(*task);
    }
  }
  out.swap(all);
  return true;
}

bool APIPollingPrivate::Wait(const std::string& fullId, const std::string& state, int seconds,
                             Json::Value& out) {
  const std::unique_ptr<ARDO::Task> task = FindTask(fullId);
  if (task == nullptr) {
    return false;
  }
  const auto end = std::chrono::steady_clock::now() +
                   std::chrono::seconds(std::clamp(seconds, 0, APIPolling::kLongestWait));
  std::string seen = state;
  for (;;) {
    Json::Value status = StatusOf(*task);
    const std::string now = stateOf(status);
    const int left = unitsUntil(end);
    if ((!seen.empty() && now != seen) || left == 0 || JsonHelper::asBool(status["finish"])) {
      status["state"] = now;
      out.swap(status);
      return true;
    }
    seen = now;
    task->waitForChange(left);
    if (!task->reload()) {
      return FailMissing(fullId);
    }
  }
}

bool APIPollingPrivate::EndProcess(const ARDO::Task& task, const std::string& fullId) {
  const int pid = task.getCreatePid();
  if (pid > 0 && !DoKill(pid, [&] { return task.getCreatePid() == pid; })) {
    WEBAPI_LOG(kPollingSource, "send SIGTERM to task id[%s] fail", LogText(fullId).c_str());
    return Fail(POLLING_ERR_NOT_SIGNALLED);
  }
  return true;
}

bool APIPollingPrivate::Stop(const std::string& fullId, bool remove) {
  if (!HasRequest()) {
    return false;
  }
  std::string owner;
  std::string taskId;
  if (!GetUserAndTaskID(fullId, owner, taskId)) {
    WEBAPI_LOG(kPollingSource, "Invalid task id[%s]", LogText(fullId).c_str());
    return Fail(POLLING_ERR_BAD_PARAMETERS);
  }
  if (!CheckTaskUser(owner)) {
    return Fail(POLLING_ERR_INVALID_ID);
  }
  const std::unique_ptr<ARDO::Task> task = LoadTask(owner, taskId);
  if (task == nullptr) {
    return FailMissing(fullId);
  }
  const bool mayRecordItself = task->getCreatePid() == 0 && !task->isFinished();
  if (!EndProcess(*task, fullId)) {
    return false;
  }
  // A process that records itself now finds the end, and ends; or it did before that was stored,
  // and is found here.
  if (mayRecordItself && task->finish(false) && task->reload() && !EndProcess(*task, fullId)) {
    return false;
  }
  if (!task->finish(remove)) {
    WEBAPI_LOG(kPollingSource, "set task id[%s] to finish fail", LogText(fullId).c_str());
    return Fail(POLLING_ERR_NOT_STORED);
  }
  return true;
}

bool APIPollingPrivate::List(const std::string& prefix, const Json::Value& groups,
                             Json::Value& out) {
  if (!HasRequest()) {
    return false;
  }
  if (!groups.isArray()) {
    WEBAPI_LOG(kPollingSource, "bad parameters");
    return Fail(POLLING_ERR_BAD_PARAMETERS);
  }
  if (!out.isObject()) {
    out = Json::Value(Json::objectValue);
  }
  for (const Json::Value& entry : groups) {
    const std::string group = JsonHelper::asString(entry);
    std::string owner;
    if (group == kAdminGroup) {
      if (!IsAdmin()) {
        return Fail(POLLING_ERR_NOT_ADMIN);
      }
      owner = kAdministratorsOwner;
    } else if (group == kEveryoneGroup) {
      owner = kEverybodyOwner;
    } else if (group == kUserGroup) {
      owner = LoginUser();
    } else {
      return Fail(POLLING_ERR_INVALID_ID);
    }
    out[group] = ConverToFullTaskId(
        owner, ARDO::TaskMgr(owner).getAllTaskId(prefix.empty() ? nullptr : prefix.c_str()));
  }
  return true;
}

bool APIPollingPrivate::CountRunning(const std::string& prefix, int& count) {
  if (!HasRequest()) {
    return false;
  }
  const std::string owner = LoginUser();
  int running = 0;
  for (const Json::Value& id : ARDO::TaskMgr(owner).getUnendedTaskId(prefix.c_str())) {
    ARDO::Task task(owner, JsonHelper::asString(id));
    running += task.reload() && !task.isFinished() ? 1 : 0;
  }
  count = running;
  return true;
}

}  // namespace QELO
