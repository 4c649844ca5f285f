// The runner's life: construction, one run of a request, destruction.

#include "webapi/APIRunner.h"

#include <sys/prctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <utility>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Paths.h"
#include "webapi/platform/WebAPIUtil.h"
#include "webapi/runner/APIRunnerPrivate.h"

namespace QELO {

APIRunner::APIRunner()
    : libDef(Json::objectValue),
      catalogue(Json::objectValue),
      request_(std::make_unique<APIRequest>(Json::Value())),
      response_(std::make_unique<APIResponse>(request_.get())),
      private_(std::make_unique<APIRunnerPrivate>(this)) {
  setsid();
  Json::Value defaults;
  if (WebAPIUtil::ReadJsonFile(Paths::kLibDef, defaults) && defaults.isObject()) {
    libDef.swap(defaults);
  }
}

APIRunner::~APIRunner() {
  CloseLib();
  response_.reset();
  request_.reset();
  const std::string name = private_->GetOrigProcName();
  private_->SetArgv0(name);
  APIRunnerPrivate::SetLogIdentity(name);
  prctl(PR_SET_NAME, name.substr(0, 16).c_str());
}

bool APIRunner::Run(const Json::Value& param) {
  if (param.isNull()) {
    response_->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  if (!Initialize(param) || !SetProcessName(request_.get(), response_.get())) {
    return false;
  }
  if (request_->HasParam("relay_zt")) {
    response_->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  return Process(request_.get(), response_.get());
}

bool APIRunner::Initialize(const Json::Value& param) {
  Json::Value env(Json::objectValue);
  if (!InitEnv(env)) {
    return false;
  }
  request_->InitEnv(std::move(env));
  if (JsonHelper::hasMember(param, "environ")) {
    request_->InitEnv(param["environ"]);
  }
  if (JsonHelper::hasMember(param, "session")) {
    request_->InitSession(param["session"]);
  }
  const Json::Value& attributes = JsonHelper::member(param, "attr");
  if (attributes.isObject()) {
    for (auto it = attributes.begin(); it != attributes.end(); ++it) {
      request_->SetAttr(it.name(), *it);
    }
  }
  if (param.empty()) {
    response_->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  request_->InitParam(param, false);
  return true;
}

bool APIRunner::InitEnv(Json::Value& env) {
  if (!env.isObject()) {
    response_->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
    const char* equals = strchr(*entry, '=');
    if (equals != nullptr) {
      env[std::string(static_cast<const char*>(*entry), equals)] = equals + 1;
    }
  }
  return true;
}

Json::Value APIRunner::GetResponse() const {
  if (response_ == nullptr) {
    return Json::Value();
  }
  Json::Value body = response_->GetBody();
  if (!body.isObject()) {  // a method may change the record in place
    body = Json::Value(Json::objectValue);
  }
  body["httpd_restart"] = response_->GetHttpdRestart();
  return body;
}

void APIRunner::SetArgs(int argc, char** argv) {
  private_->SetArgs(argc, argv);
}

bool APIRunner::SetProcessName(APIRequest* request, APIResponse* response) {
  const std::string api = request->GetAPIClass();
  if (api.empty()) {
    response->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  // Names are C text to the system: each part ends at its NUL, and none is endless.
  const std::string call = std::string(api.c_str()) + "_" +
                           std::to_string(request->GetAPIVersion()) + "_" +
                           request->GetAPIMethod().c_str();
  std::string full = private_->GetProcName() + "_" + call;
  full.resize(std::min(full.size(), APIRunnerPrivate::kLongestName));
  APIRunnerPrivate::SetLogIdentity(full);
  private_->SetArgv0(full);
  if (prctl(PR_SET_NAME, call.substr(0, 16).c_str()) != 0) {
    WEBAPI_LOG("APIRunner.cpp", "Set process name fail[%m]");
    response->SetError(WEBAPI_ERR_PROCESS_NAME);
    return false;
  }
  return true;
}

bool APIRunner::CheckSharingPermission(APIRequest*, APIResponse*) {
  return true;
}

bool APIRunner::NeedPermission(APIRequest*) {
  return false;
}

bool APIRunner::CheckPermission(APIRequest*, APIResponse*) {
  return true;
}

bool APIRunner::HandleUpload(APIRequest*, APIResponse*) {
  return true;
}

bool APIRunner::SkipPermission(APIRequest*) {
  return true;
}

}  // namespace QELO
