// The status of tasks, now and once it changes.

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>

#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/batch/polling/APIPollingPrivate.h"
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
    bool busy = false;
    if (!GetUserAndTaskID(fullId, owner, taskId) || !CheckTaskUser(owner)) {
      WEBAPI_LOG(kPollingSource, "Invalid task id[%s]", LogText(fullId).c_str());
    } else if (const std::unique_ptr<ARDO::Task> task = LoadTask(owner, taskId, busy)) {
      status = StatusOf(*task);
    } else if (busy) {
      status["busy"] = true;
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
      return FailUnread(fullId, task->isBusy());
    }
  }
}

}  // namespace QELO
