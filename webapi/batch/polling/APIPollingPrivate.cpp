#include "webapi/batch/polling/APIPollingPrivate.h"

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/batch/polling/Terms.h"
#include "webapi/model/request/CallerSession.h"
#include "webapi/platform/Task.h"

namespace QELO {

APIPollingPrivate::APIPollingPrivate(APIRequest* request, APIPolling* owner)
    : owner_(owner), request_(request), error_(POLLING_ERR_UNKNOWN) {
  InitField("polling_attribute");
}

APIPollingPrivate::~APIPollingPrivate() = default;

void APIPollingPrivate::SetUser(const std::string& user) {
  Json::Value init;
  init["session"] = CallerSession::OfUser(user);
  ownRequest_ = std::make_unique<APIRequest>(init);
  request_ = ownRequest_.get();
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

std::unique_ptr<ARDO::Task> APIPollingPrivate::LoadTask(const std::string& owner,
                                                        const std::string& taskId, bool& busy) {
  auto task = std::make_unique<ARDO::Task>(owner, taskId);
  // Read although it is there: it may have removed itself since, and what is not there would look
  // as if it ran. And although it is not: its store may have been busy.
  const bool exists = ARDO::TaskUtil::checkTaskExists(owner, taskId);
  const bool there = task->reload();
  busy = !exists && !there && task->isBusy();
  return there ? std::move(task) : nullptr;
}

bool APIPollingPrivate::FailUnread(const std::string& fullId, bool busy) {
  if (busy) {
    WEBAPI_LOG(kPollingSource, "task id[%s] cannot be read now", LogText(fullId).c_str());
    return Fail(POLLING_ERR_BUSY);
  }
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
  bool busy = false;
  std::unique_ptr<ARDO::Task> task = LoadTask(owner, taskId, busy);
  if (task == nullptr) {
    FailUnread(fullId, busy);
  }
  return task;
}

}  // namespace QELO
