// The compound request as a whole: parameters, preparation, the walk over the entries and the
// combined answer.

#include "webapi/CompoundHandler.h"

#include <poll.h>
#include <unistd.h>

#include <cstdlib>
#include <new>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/Pipe.h"
#include "webapi/base/Log.h"
#include "webapi/batch/compound/EntryLimit.h"
#include "webapi/batch/pipe/AnswerPipe.h"
#include "webapi/model/request/CallerSession.h"
#include "webapi/runner/CompoundCall.h"
#include "webapi/runner/execution/StandardStreams.h"
#include "webapi/runner/execution/WorkingDirectory.h"

namespace QELO {
namespace {

constexpr char kSource[] = "CompoundHandler.cpp";
constexpr const char* kCallerSections[] = {"session", "cookie"};

Json::Value asPostParameters(const Json::Value& entry) {
  Json::Value params;
  params["postParam"] = entry;
  return params;
}

}  // namespace

CompoundHandler::CompoundHandler(APIRequest* request, APIResponse* response, APIRunner* runner)
    : request_(request),
      response_(response),
      runner_(runner),
      data_(Json::objectValue),
      info_(Json::arrayValue) {
  data_["result"] = Json::Value(Json::arrayValue);
}

CompoundHandler::~CompoundHandler() {
  for (const Child& child : children_) {
    delete child.first;
  }
}

bool CompoundHandler::Process() {
  int code = ParseParams();
  if (code != WEBAPI_ERR_NONE) {
    WEBAPI_LOG(kSource, "ParseParams failed");
  } else if ((code = PrepareNewCompReqResp()) != WEBAPI_ERR_NONE) {
    WEBAPI_LOG(kSource, "PrepareNewCompReqResp failed");
  } else if (!EntryLimit::AllowsCaller(*request_, entryCount_, *runner_)) {
    code = RefuseSize();
  } else if ((code = CompoundProcess()) != WEBAPI_ERR_NONE) {
    WEBAPI_LOG(kSource, "CompoundProcess failed");
  }
  Output(static_cast<_tag_WEBAPI_ERR>(code));
  if (entryResponse_ != nullptr) {
    response_->SetCallbackFuncs(entryResponse_->GetCallbackFuncs());
  }
  return code == WEBAPI_ERR_NONE;
}

int CompoundHandler::ParseParams() {
  static const Json::Value null;
  parallel_ = JsonHelper::asString(request_->GetParam("mode", "sequential")) == "parallel";
  stopWhenError_ = !parallel_ && JsonHelper::asBool(request_->GetParam("stop_when_error", false));
  entries_ = &request_->GetParamRef("compound", null);
  if (!entries_->isArray()) {
    return WEBAPI_ERR_NO_COMPOUND;
  }
  const unsigned most = EntryLimit::Most(*request_);
  entryCount_ = EntryLimit::Count(*entries_, most);
  return entryCount_ <= most ? WEBAPI_ERR_NONE : RefuseSize();
}

int CompoundHandler::RefuseSize() {
  message_ = "too many compound entries.";
  WEBAPI_LOG(kSource, "too many compound entries");
  return WEBAPI_ERR_NO_COMPOUND;
}

int CompoundHandler::PrepareNewCompReqResp() {
  entryRequest_.reset(new (std::nothrow) APIRequest(*request_));
  if (entryRequest_ == nullptr) {
    WEBAPI_LOG(kSource, "new APIRequest Fail");
    return WEBAPI_ERR_NO_ANSWER;
  }
  PrepareEnvironment();
  KeepCaller();
  entryRequest_->InitParam(asPostParameters(Json::Value(Json::objectValue)), false);
  entryResponse_.reset(new (std::nothrow) APIResponse(entryRequest_.get()));
  if (entryResponse_ == nullptr) {
    WEBAPI_LOG(kSource, "new APIResponse Fail");
    return WEBAPI_ERR_NO_ANSWER;
  }
  return WEBAPI_ERR_NONE;
}

void CompoundHandler::PrepareEnvironment() {
  Json::Value environment = request_->GetEnv("");
  if (!environment.isObject()) {
    environment = Json::Value(Json::objectValue);
  }
  environment.removeMember("QUERY_STRING");
  environment["REQUEST_METHOD"] = "POST";
  // The copy has the outer request's environment, into which this would only be merged.
  entryRequest_->Serialize()["environ"] = Json::Value(Json::objectValue);
  entryRequest_->InitEnv(environment);
}

/// A method may change the record in place, to what can take no entry.
void CompoundHandler::RepairRequest() {
  const Json::Value& record = entryRequest_->Serialize();
  if (!JsonHelper::member(record, "private").isObject() ||
      !JsonHelper::member(record, "param").isObject()) {
    Json::Value fresh = request_->Serialize();
    entryRequest_->Deserialize(fresh);
    PrepareEnvironment();
  }
}

void CompoundHandler::KeepCaller() {
  const Json::Value& record = entryRequest_->Serialize();
  caller_ = Json::Value(Json::objectValue);
  for (const char* section : kCallerSections) {
    caller_[section] = JsonHelper::member(record, section);
  }
  const char* user = getenv(kCallerVariable);
  caller_[kCallerVariable] = user != nullptr ? Json::Value(user) : Json::Value();
}

/// Entries before this one may have left their caller, whom an entry that asks for no permission
/// would go on with.
void CompoundHandler::RestoreCaller() {
  for (const char* section : kCallerSections) {
    entryRequest_->Serialize()[section] = caller_[section];
  }
  const Json::Value& user = caller_[kCallerVariable];
  if (user.isNull() || setenv(kCallerVariable, user.asCString(), 1) != 0) {
    unsetenv(kCallerVariable);
  }
}

void CompoundHandler::TakeEntry(const Json::Value& entry) {
  RepairRequest();
  RestoreCaller();
  entryRequest_->InitParam(asPostParameters(entry), true);
}

void CompoundHandler::PreloadLibs() {
  // A library's constructors are foreign code.
  const WorkingDirectory directory;
  const StandardStreams shut(true, true);
  if (directory.IsSaved() && shut.IsShut()) {
    PreloadLibs(*entries_, true);
  }
}

void CompoundHandler::PreloadLibs(const Json::Value& value, bool top) {
  const Json::Value& nested = top ? value : JsonHelper::member(value, "compound");
  if (top || JsonHelper::hasMember(value, "compound")) {
    if (nested.isArray() || nested.isObject()) {
      for (const Json::Value& element : nested) {
        PreloadLibs(element, false);
      }
    }
    return;
  }
  TakeEntry(value);
  runner_->GetMethod(entryRequest_->GetAPIClass(), entryRequest_->GetAPIVersion(),
                     entryRequest_->GetAPIMethod());
  runner_->AddAPIInfo(entryRequest_.get());
  void* handle = nullptr;
  runner_->CacheLib(entryRequest_.get(), &handle);
}

/// Work for a client, or a parent, who has gone helps nobody.
bool CompoundHandler::IsClientGone() const {
  pollfd output{STDOUT_FILENO, 0, 0};
  return !isAnswerAwaited() ||
         (JsonHelper::asBool(request_->GetAttr(kAnswersOnOutput)) && poll(&output, 1, 0) > 0 &&
          (output.revents & (POLLERR | POLLHUP)) != 0);
}

int CompoundHandler::CompoundProcess() {
  data_["result"] = Json::Value(Json::arrayValue);
  if (!parallel_) {
    PreloadLibs();
  }
  for (unsigned index = 0; index < entries_->size(); ++index) {
    if (IsClientGone()) {
      WEBAPI_LOG(kSource, "nobody reads the answer, %u entries are left out",
                 entries_->size() - index);
      hasFail_ = true;
      break;
    }
    if (CompoundProcessEntry((*entries_)[index], index) != WEBAPI_ERR_NONE) {
      hasFail_ = true;
    }
  }
  if (parallel_) {
    for (Child& child : children_) {
      PrepareCompundResponseFromChild(child);
    }
  }
  HandleCompoundInfo();
  return WEBAPI_ERR_NONE;
}

void CompoundHandler::HandleCompoundInfo() {
  for (const Json::Value& info : info_) {
    if (JsonHelper::asInt(JsonHelper::member(info, "error")) != 0) {
      hasFail_ = true;
    }
    if (JsonHelper::hasMember(info, "x-request-error")) {
      response_->SetServerError(JsonHelper::asString(info["x-request-error"]));
    }
    if (JsonHelper::asBool(JsonHelper::member(info, "restart_httpd"))) {
      response_->SetHttpdRestart(true);
    }
  }
}

void CompoundHandler::Output(_tag_WEBAPI_ERR code) {
  data_["has_fail"] = hasFail_;
  if (code != WEBAPI_ERR_NONE) {
    response_->SetError(code, message_);
  } else {
    response_->SetSuccess(data_);
  }
}

}  // namespace QELO
