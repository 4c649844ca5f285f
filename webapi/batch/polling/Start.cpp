// How a background task is started: its record, its process, its end.

#include <errno.h>
#include <signal.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/batch/polling/APIPollingPrivate.h"
#include "webapi/batch/polling/ForeignPipes.h"
#include "webapi/batch/polling/Terms.h"
#include "webapi/model/response/APIResponsePrivate.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Task.h"
#include "webapi/runner/execution/Fence.h"
#include "webapi/runner/execution/StandardStreams.h"

namespace QELO {
namespace {

/// How long the answer to the start waits for a first result, in units of 10 ms.
constexpr int kFirstResultLimit = 60;

/// What names the call is not a parameter of it. The rest are credentials: whoever may see the
/// task must not get its starter's login.
constexpr const char* kLeftOut[] = {"api", "version",     "method",      "_sid",
                                    "tid", "_sharing_id", "_sharing_sid"};

}  // namespace

std::string APIPollingPrivate::Attribute(const char* name) const {
  return JsonHelper::asString(GetData("polling_attribute", name, ""));
}

bool APIPollingPrivate::IsSet(const char* name, bool def) const {
  return JsonHelper::asBool(GetData("polling_attribute", name, def), def);
}

bool APIPollingPrivate::SetGroupAttr(const std::string& group) {
  if (!group.empty() && group != kAdminGroup && group != kEveryoneGroup) {
    WEBAPI_LOG(kPollingSource, "bad parameters");
    return false;
  }
  if (group == kAdminGroup && !IsAdmin()) {
    WEBAPI_LOG(kPollingSource, "No permission");
    return false;
  }
  return SetData("polling_attribute", "share_to_group", group, true);
}

int APIPollingPrivate::FindOwner(const std::string& group, std::string& owner) const {
  if (group.empty()) {
    owner = LoginUser();
  } else if (group == kAdminGroup) {
    if (!IsAdmin()) {
      return WEBAPI_ERR_NO_PERMISSION;
    }
    owner = kAdministratorsOwner;
  } else if (group == kEveryoneGroup) {
    owner = kEverybodyOwner;
  } else {
    return WEBAPI_ERR_POLLING_GROUP;
  }
  return WEBAPI_ERR_NONE;
}

Json::Value APIPollingPrivate::DescribeCall() const {
  Json::Value info(Json::objectValue);
  info["api"] = request_->GetAPIClass();
  info["version"] = request_->GetAPIVersion();
  info["method"] = request_->GetAPIMethod();
  if (!IsSet("auto_remove_params", false)) {
    Json::Value param = request_->GetParam("", Json::objectValue);
    for (const char* name : kLeftOut) {
      if (param.isObject()) {
        param.removeMember(name);
      }
    }
    info["param"] = param;
  }
  info["group"] = Attribute("share_to_group");
  info["prefix"] = Attribute("task_id_prefix");
  return info;
}

bool APIPollingPrivate::Start(APIResponse* response, APIPolling::Work work, void* arg) {
  if (!HasRequest()) {
    return false;
  }
  if (response == nullptr || work == nullptr) {
    WEBAPI_LOG(kPollingSource, "bad parameters");
    return Fail(POLLING_ERR_BAD_PARAMETERS);
  }
  std::string owner;
  if (const int error = FindOwner(Attribute("share_to_group"), owner); error != WEBAPI_ERR_NONE) {
    response->SetError(error);
    return false;
  }
  const std::string taskId = ARDO::TaskUtil::getUniqueID(owner, Attribute("task_id_prefix"));
  ARDO::Task task(owner, taskId);
  task.beginUpdate();
  task.setProperty("info", DescribeCall());
  task.setProperty("auto_remove", IsSet("auto_remove", true));
  if (!task.endUpdate()) {
    WEBAPI_LOG(kPollingSource, "Failed to set property.");
    return false;
  }
  if (!IsWithinLimit(owner, taskId)) {
    task.remove();
    return false;
  }
  const pid_t starter = getpid();
  const pid_t child = QLIBCProcFork();
  if (child < 0) {
    const int error = errno;
    task.remove();
    WEBAPI_LOG(kPollingSource, "Failed to fork(). %s", strerror(error));
    response->SetError(WEBAPI_ERR_NO_COMPOUND);
    return false;
  }
  if (child == 0) {
    LeaveStarter(starter);
    RunChild(owner, taskId, response, work, arg);
  }
  task.waitForDataReady("task_run", kFirstResultLimit);
  Json::Value answer;
  answer["task_id"] = owner + "/" + taskId;
  response->SetSuccess(answer);
  return true;
}

/// Recorded first and counted then: of several who start at once each sees those before it.
bool APIPollingPrivate::IsWithinLimit(const std::string& owner, const std::string& taskId) {
  int running = 0;
  if (limit_ <= 0) {
    return true;
  }
  return CountBefore(owner, Attribute("task_id_prefix"), taskId, running) &&
         (running < limit_ || Fail(POLLING_ERR_TOO_MANY));
}

/// What the process has from its starter and must not keep.
void APIPollingPrivate::LeaveStarter(pid_t starter) noexcept {
  setsid();
  // A daemon that starts a task takes SIGTERM as it likes; the task ends by it.
  sigset_t stop;
  sigemptyset(&stop);
  sigaddset(&stop, SIGTERM);
  signal(SIGTERM, SIG_DFL);
  sigprocmask(SIG_UNBLOCK, &stop, nullptr);
  StandardStreams::LetGo();
  mutePipesToOthers(starter);
}

/// Nothing may leave this function: behind it lies the parent's work.
void APIPollingPrivate::RunChild(const std::string& owner, const std::string& taskId,
                                 APIResponse* response, APIPolling::Work work, void* arg) noexcept {
  Json::Value environment(Json::objectValue);
  environment["task_id"] = taskId;
  environment["task_user"] = owner;
  environment["full_task_id"] = owner + "/" + taskId;
  request_->Serialize()["environ"] = environment;
  // Not the parent's object: what it holds open cannot be shared with a child.
  ARDO::Task task(owner, taskId);
  const bool recorded = task.setCreatePid(getpid());
  if (task.reload() && !task.isFinished()) {
    if (!recorded) {
      WEBAPI_LOG(kPollingSource, "Failed to set property.");
    }
    Fence(
        "polling task", [&] { work(request_, response, arg); }, kPollingSource);
    FinishTask(task, response);
  }  // else it was stopped before it began, and nobody could see the work or stop it
  // Not exit(): handlers that the parent registered for its end, and what it has buffered in C++
  // streams, are the parent's.
  fflush(nullptr);
  _exit(0);
}

void APIPollingPrivate::FinishTask(ARDO::Task& task, APIResponse* response) const {
  const std::string fullId = request_->GetPollingTaskId();
  if (!task.reload()) {
    return;  // it was removed meanwhile
  }
  if (response->private_->TaskLacksResult()) {
    WEBAPI_LOG(kPollingSource, "cannot store a result of task id[%s]", LogText(fullId).c_str());
  }
  if (!task.hasProperty("task_run")) {
    response->SetError(WEBAPI_ERR_NO_ANSWER);
  }
  if (task.reload() && !task.finish(task.getBoolProperty("auto_remove", false)) && task.reload()) {
    WEBAPI_LOG(kPollingSource, "set task id[%s] to finish fail", LogText(fullId).c_str());
  }
}

}  // namespace QELO
