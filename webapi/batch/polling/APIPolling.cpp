#include "webapi/APIPolling.h"

#include "webapi/batch/polling/APIPollingPrivate.h"
#include "webapi/batch/polling/Terms.h"

namespace QELO {

APIPolling::APIPolling() : APIPolling(nullptr) {}

APIPolling::APIPolling(APIRequest* request)
    : private_(std::make_unique<APIPollingPrivate>(request, this)) {}

APIPolling::~APIPolling() = default;

std::unique_ptr<APIPolling> APIPolling::ForUser(const std::string& user) {
  auto polling = std::make_unique<APIPolling>();
  polling->private_->SetUser(user);
  return polling;
}

void APIPolling::SetRequest(APIRequest* request) {
  private_->SetRequest(request);
}

bool APIPolling::SetPrefixAttr(const std::string& prefix) {
  return private_->SetData("polling_attribute", "task_id_prefix", prefix, true);
}

bool APIPolling::SetRemoveAttr(bool remove) {
  return private_->SetData("polling_attribute", "auto_remove", remove, false);
}

bool APIPolling::SetRemoveParam(bool remove) {
  return private_->SetData("polling_attribute", "auto_remove_params", remove, false);
}

bool APIPolling::SetGroupAttr(const std::string& group) {
  return private_->SetGroupAttr(group);
}

void APIPolling::SetLimit(int most) {
  private_->SetLimit(most);
}

bool APIPolling::Start(APIResponse* response, Work work, void* arg) {
  return private_->Start(response, work, arg);
}

bool APIPolling::Status(const std::string& fullId, Json::Value& out) {
  return private_->Status(fullId, out);
}

bool APIPolling::Status(const char* fullId, Json::Value& out) {
  return private_->Status(std::string(fullId != nullptr ? fullId : ""), out);
}

bool APIPolling::Status(const Json::Value& fullIds, Json::Value& out) {
  return private_->Status(fullIds, out);
}

bool APIPolling::Wait(const std::string& fullId, const std::string& state, int seconds,
                      Json::Value& out) {
  return private_->Wait(fullId, state, seconds, out);
}

bool APIPolling::Stop(const std::string& fullId, bool remove) {
  return private_->Stop(fullId, remove);
}

bool APIPolling::Keep(const std::string& fullId) {
  return private_->Keep(fullId);
}

bool APIPolling::Release(const std::string& fullId) {
  return private_->Release(fullId);
}

bool APIPolling::List(const std::string& prefix, const Json::Value& groups, Json::Value& out) {
  return private_->List(prefix, groups, out);
}

bool APIPolling::CountRunning(const std::string& prefix, int& count) {
  return private_->CountRunning(prefix, count);
}

void APIPolling::SetError(int code) {
  private_->SetError(code);
}

int APIPolling::GetError() const {
  return private_->error();
}

const char* APIPolling::ErrorText(int code) {
  switch (code) {
    case POLLING_ERR_UNKNOWN:
      return "nothing is known of an error";
    case POLLING_ERR_NOT_STORED:
      return "the task's record cannot be changed";
    case POLLING_ERR_BAD_PARAMETERS:
    case POLLING_ERR_INVALID_ID:
      return "not a task's id, or another user's task";
    case POLLING_ERR_BUSY:
      return "the task's record is busy; try again later";
    case POLLING_ERR_NOT_ADMIN:
      return "the tasks are the administrators'";
    case POLLING_ERR_NOT_SIGNALLED:
      return "the task's process cannot be signalled";
    case POLLING_ERR_TOO_MANY:
      return "as many tasks run as may at once";
    case POLLING_ERR_NO_SUCH_TASK:
      return "there is no such task, or it ended and its record was removed";
    default:
      return nullptr;
  }
}

}  // namespace QELO
