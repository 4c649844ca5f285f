#include "webapi/APIPolling.h"

#include "webapi/batch/polling/APIPollingPrivate.h"

namespace QELO {

APIPolling::APIPolling() : APIPolling(nullptr) {}

APIPolling::APIPolling(APIRequest* request)
    : private_(std::make_unique<APIPollingPrivate>(request, this)) {}

APIPolling::~APIPolling() = default;

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

}  // namespace QELO
