// Which tasks there are.

#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/batch/polling/APIPollingPrivate.h"
#include "webapi/batch/polling/Terms.h"
#include "webapi/platform/Task.h"

namespace QELO {
namespace {

/// The ids with this prefix, from the task manager's own list. No id has a NUL, behind which the
/// task manager would not see the prefix.
/// @param list  takes null for all
template <typename List>
Json::Value listIds(const std::string& prefix, const List& list) {
  if (prefix.find('\0') != std::string::npos) {
    return Json::Value(Json::arrayValue);
  }
  return list(prefix.empty() ? nullptr : prefix.c_str());
}

}  // namespace

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
    ARDO::TaskMgr tasks(owner);
    const Json::Value ids =
        listIds(prefix, [&](const char* front) { return tasks.getAllTaskId(front); });
    if (tasks.isIncomplete()) {
      return Fail(POLLING_ERR_BUSY);
    }
    out[group] = ConverToFullTaskId(owner, ids);
  }
  return true;
}

bool APIPollingPrivate::CountRunning(const std::string& prefix, int& count) {
  return HasRequest() && CountBefore(LoginUser(), prefix, "", count);
}

bool APIPollingPrivate::CountBefore(const std::string& owner, const std::string& prefix,
                                    const std::string& taskId, int& count) {
  ARDO::TaskMgr tasks(owner);
  const Json::Value ids =
      listIds(prefix, [&](const char* front) { return tasks.getUnendedTaskId(front); });
  bool busy = tasks.isIncomplete();
  int running = 0;
  for (const Json::Value& entry : ids) {
    const std::string id = JsonHelper::asString(entry);
    if (busy || id == taskId) {
      break;
    }
    ARDO::Task task(owner, id);
    const bool there = task.reload();
    busy = !there && task.isBusy();
    running += there && !task.isFinished() ? 1 : 0;
  }
  if (busy) {
    return Fail(POLLING_ERR_BUSY);
  }
  count = running;
  return true;
}

}  // namespace QELO
