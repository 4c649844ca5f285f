#include "programs/webapi-exec/follow/FollowedTask.h"

#include "webapi/APIPolling.h"
#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIErrorText.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Task.h"

namespace QELO::ExecProgram {
namespace {

constexpr char kRemoveWithEnd[] = "auto_remove";

enum PollingError : int {
  kNotStored = 501,
  kMalformedId = 502,
  kNotTheUsers = 503,
  kNotSignalled = 506,
  kNoSuchTask = 508
};

Json::Value requestOf(const std::string& user) {
  Json::Value request(Json::objectValue);
  Json::Value& session = request["session"];
  session["username"] = user;
  session["isAdmin"] = QLIBGroupIsAdminGroupMem(user.c_str(), 0) == 1;
  session["isTimeout"] = false;
  session["isAuthorized"] = true;
  return request;
}

}  // namespace

FollowedTask::FollowedTask(const std::string& user, const std::string& id)
    : request_(requestOf(user)), id_(id) {
  const size_t slash = id.find('/');
  owner_ = id.substr(0, slash);
  taskId_ = slash == std::string::npos ? "" : id.substr(slash + 1);
}

int FollowedTask::Look(Json::Value& status) const {
  APIRequest request(request_);
  APIPolling polling(&request);
  return polling.Status(id_, status) ? 0 : polling.GetError();
}

int FollowedTask::Wait(const std::string& state, int seconds, Json::Value& status) const {
  APIRequest request(request_);
  APIPolling polling(&request);
  return polling.Wait(id_, state, seconds, status) ? 0 : polling.GetError();
}

int FollowedTask::Stop() const {
  APIRequest request(request_);
  APIPolling polling(&request);
  return polling.Stop(id_, false) ? 0 : polling.GetError();
}

void FollowedTask::Keep(const Json::Value& status) {
  isKept_ = JsonHelper::asBool(JsonHelper::member(status, kRemoveWithEnd)) &&
            ARDO::Task(owner_, taskId_).setProperty(kRemoveWithEnd, false);
}

void FollowedTask::Release() {
  if (!isKept_) {
    return;
  }
  isKept_ = false;
  ARDO::Task task(owner_, taskId_);
  if (!task.isFinished()) {
    task.setProperty(kRemoveWithEnd, true);
    task.reload();  // it may have ended before it saw that
  }
  if (task.isFinished()) {
    task.remove();
  }
}

const char* taskErrorText(int code) {
  switch (code) {
    case kNotStored:
      return "the task's record cannot be changed";
    case kMalformedId:
    case kNotTheUsers:
      return "not a task's id, or another user's task";
    case kNotSignalled:
      return "the task's process cannot be signalled";
    case kNoSuchTask:
      return "there is no such task, or it ended and its record was removed";
    default:
      return WebAPIErrorText(code);
  }
}

}  // namespace QELO::ExecProgram
