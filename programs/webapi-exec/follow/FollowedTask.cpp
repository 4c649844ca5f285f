#include "programs/webapi-exec/follow/FollowedTask.h"

#include "webapi/WebAPIErrorText.h"

namespace QELO::ExecProgram {

FollowedTask::FollowedTask(const std::string& user, const std::string& id)
    : polling_(APIPolling::ForUser(user)), id_(id) {}

int FollowedTask::Look(Json::Value& status) const {
  return polling_->Status(id_, status) ? 0 : polling_->GetError();
}

int FollowedTask::Wait(const std::string& state, int seconds, Json::Value& status) const {
  return polling_->Wait(id_, state, seconds, status) ? 0 : polling_->GetError();
}

int FollowedTask::Stop() const {
  return polling_->Stop(id_, false) ? 0 : polling_->GetError();
}

void FollowedTask::Keep() {
  isKept_ = polling_->Keep(id_);
}

void FollowedTask::Release() {
  if (isKept_) {
    isKept_ = false;
    polling_->Release(id_);
  }
}

const char* taskErrorText(int code) {
  const char* text = APIPolling::ErrorText(code);
  return text != nullptr ? text : WebAPIErrorText(code);
}

}  // namespace QELO::ExecProgram
