// One entry of a compound request: in this process or in a forked child that sends its answer
// back.

#include <errno.h>
#include <signal.h>
#include <unistd.h>

#include <ctime>
#include <string>

#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/CompoundHandler.h"
#include "webapi/JsonHelper.h"
#include "webapi/Pipe.h"
#include "webapi/base/Log.h"
#include "webapi/base/NullDevice.h"
#include "webapi/batch/compound/EntryLimit.h"
#include "webapi/batch/pipe/AnswerPipe.h"
#include "webapi/platform/Core.h"

namespace QELO {
namespace {

constexpr char kSource[] = "CompoundHandler.cpp";
/// Leaves the child's standard descriptors as they are.
constexpr int kForkFlags = 65;
constexpr useconds_t kParentPollMicroseconds = 200000;

/// The web server ends the answer when the last holder of our standard output lets go, so who
/// waits for the parent's end must not hold it.
void releaseStandardDescriptors() {
  LetGoOf({STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO});
}

bool transfersFile(const Json::Value& attributes) {
  return APIDescription::IsSet(attributes, "allowUpload") ||
         APIDescription::IsSet(attributes, "allowDownload");
}

/// What every child would find out anew: the time zone for its log, the files of accounts.
void lookAhead(const APIRequest& request) {
  tzset();
  const std::string user = request.GetLoginUserName();
  QLIBGroupIsAdminGroupMem(user.empty() ? "root" : user.c_str(), 0);
}

/// A process that gave up root may not signal its parent, which is still there then; and the
/// number may be another's later, which is not our parent.
bool isAlive(pid_t parent) {
  return getppid() == parent && (kill(parent, 0) == 0 || errno == EPERM);
}

}  // namespace

int CompoundHandler::RefuseEntry(int code, const char* message, unsigned index) {
  if (message != nullptr) {
    message_ = message;
  }
  entryResponse_->SetError(code);
  PrepareCompundResponse(index);
  return code;
}

int CompoundHandler::CompoundProcessEntry(const Json::Value& entry, unsigned index) {
  TakeEntry(entry);
  EntryLimit::Mark(*entryRequest_, entryCount_);
  // An entry that ends without an answer must not show the one before it.
  entryResponse_->SetError(WEBAPI_ERR_NO_ANSWER);
  if (stopWhenError_ && hasFail_) {
    return RefuseEntry(WEBAPI_ERR_COMPOUND_STOPPED, "compound stop when error.", index);
  }
  if (transfersFile(runner_->GetMethod(entryRequest_->GetAPIClass(), entryRequest_->GetAPIVersion(),
                                       entryRequest_->GetAPIMethod()))) {
    return RefuseEntry(WEBAPI_ERR_COMPOUND_TRANSFER, "not allow upload or download API.", index);
  }
  if (parallel_ || (!runner_->GetMethodAttr(entryRequest_.get(), "grantable") &&
                    !runner_->GetMethodAttr(entryRequest_.get(), "grantByDefault"))) {
    return ForkEntry(index);
  }
  if (!runner_->Process(entryRequest_.get(), entryResponse_.get()) ||
      entryResponse_->GetError() != 0) {
    hasFail_ = true;
  }
  PrepareCompundResponse(index);
  return WEBAPI_ERR_NONE;
}

int CompoundHandler::ForkEntry(unsigned index) {
  if (children_.empty()) {
    lookAhead(*entryRequest_);
  }
  Child child;
  if (!InitNewPipe(child, index)) {
    WEBAPI_LOG(kSource, "pipe init Fail");
    return RefuseEntry(WEBAPI_ERR_NO_ANSWER, nullptr, index);
  }
  if (!ProcessFork(child)) {
    WEBAPI_LOG(kSource, "fork Fail");
    return RefuseEntry(WEBAPI_ERR_NO_ANSWER, nullptr, index);
  }
  if (parallel_) {
    // Stands until the child has answered, and for good when it never does.
    PrepareCompundResponse(index);
  } else {
    PrepareCompundResponseFromChild(child);
  }
  return WEBAPI_ERR_NONE;
}

bool CompoundHandler::InitNewPipe(Child& child, unsigned index) {
  child = {new Pipe, index};
  children_.push_back(child);
  if (!child.first->Init()) {
    WEBAPI_LOG(kSource, "Pipe init failed");
    return false;
  }
  return true;
}

bool CompoundHandler::ProcessFork(Child& child) {
  const pid_t parent = getpid();
  const pid_t pid = QLIBCProcForkEx(kForkFlags);
  if (pid < 0) {
    child.first->Close();  // with the write end open, reading would wait for ever
    return false;
  }
  if (pid == 0) {
    RunChild(*child.first, parent);
  }
  child.first->ReadOnly(-1);
  return true;
}

void CompoundHandler::RunChild(Pipe& pipe, pid_t parent) noexcept {
  // Other children's answers are none of ours, and neither are callbacks of entries that ran
  // before the fork: the parent runs those.
  for (const Child& child : children_) {
    if (child.first != &pipe) {
      child.first->Close();
    }
  }
  entryResponse_->GetCallbackFuncs()->clear();
  pipe.WriteOnly(-1);
  takeAnswerPipe(pipe);
  runner_->Process(entryRequest_.get(), entryResponse_.get());
  SendAnswer(pipe);
  pipe.Close();
  if (!entryResponse_->GetCallbackFuncs()->empty()) {
    releaseStandardDescriptors();
    while (isAlive(parent)) {
      usleep(kParentPollMicroseconds);
    }
    runner_->HandleCallback(entryResponse_.get());
  }
  _exit(0);
}

void CompoundHandler::SendAnswer(Pipe& pipe) {
  Json::Value message;
  PrepareCompundResponse(message["result"], message["info"]);
  if (pipe.WriteJson(message)) {
    return;
  }
  WEBAPI_LOG(kSource, "write json failed");
  if (pipe.HasWritten()) {
    return;  // the reader would take a second message for the rest of the first
  }
  // There was no room for it, or no reader would take it: say that much.
  entryResponse_->SetError(WEBAPI_ERR_NO_ANSWER);
  PrepareCompundResponse(message["result"], message["info"]);
  pipe.WriteJson(message);
}

void CompoundHandler::PrepareCompundResponseFromChild(Child& child) {
  Json::Value message;
  if (child.first->ReadJson(message) && JsonHelper::member(message, "result").isObject() &&
      JsonHelper::member(message, "info").isObject()) {
    data_["result"][child.second].swap(message["result"]);
    info_[child.second].swap(message["info"]);
    if (JsonHelper::asInt(JsonHelper::member(info_[child.second], "error")) != 0) {
      hasFail_ = true;
    }
  } else {
    WEBAPI_LOG(kSource, "read compound json failed");
    data_["result"][child.second];  // null, when there is no placeholder
    hasFail_ = true;
  }
  child.first->Close();
}

void CompoundHandler::PrepareCompundResponse(unsigned index) {
  PrepareCompundResponse(data_["result"][index], info_[index]);
}

void CompoundHandler::PrepareCompundResponse(Json::Value& result, Json::Value& info) {
  result = entryResponse_->GetBody();
  if (!result.isObject()) {  // a method may change the record in place
    result = Json::Value(Json::objectValue);
  }
  const std::string api = entryRequest_->GetAPIClass();
  const int version = entryRequest_->GetAPIVersion();
  const std::string method = entryRequest_->GetAPIMethod();
  if (!api.empty() && version > 0 && !method.empty()) {
    result["api"] = api;
    result["version"] = version;
    result["method"] = method;
  }
  info = Json::Value(Json::objectValue);
  info["error"] = entryResponse_->GetError();
  info["restart_httpd"] = entryResponse_->GetHttpdRestart();
  if (entryResponse_->HasServerError()) {
    info["x-request-error"] = entryResponse_->GetServerError();
  }
}

}  // namespace QELO
