// The runner's face: its life, the road of a request, and what its rooms do under its name.

#include "webapi/APIRunner.h"

#include <sys/prctl.h>
#include <unistd.h>

#include <cstring>
#include <utility>

#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/CompoundHandler.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/base/MemoryBound.h"
#include "webapi/runner/APIRunnerPrivate.h"
#include "webapi/runner/APIRunnerRooms.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/Callbacks.h"
#include "webapi/runner/CompoundCall.h"
#include "webapi/runner/counter/UsageCounter.h"
#include "webapi/runner/daemon/DaemonCall.h"
#include "webapi/runner/execution/Execution.h"
#include "webapi/runner/execution/ParamCheck.h"
#include "webapi/runner/library/PreloadedLibraries.h"
#include "webapi/runner/road/CallRoad.h"

namespace QELO {

APIRunner::APIRunner()
    : libDef(Json::objectValue),
      catalogue(Json::objectValue),
      request_(std::make_unique<APIRequest>(Json::Value())),
      response_(std::make_unique<APIResponse>(request_.get())),
      private_(std::make_unique<APIRunnerPrivate>(this)),
      rooms_(new Rooms{Catalogue(libDef, catalogue), LibraryCache(libraries_), nullptr}) {
  setsid();
  Catalogue::ReadLibDef(libDef);
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
  if (env.type() != Json::objectValue) {
    response_->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
    const char* equals = strchr(*entry, '=');
    if (equals != nullptr) {
      const char* value = equals + 1;
      *env.demand(*entry, equals) = Json::Value(value, value + strlen(value));
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
  if (!private_->SetCallName(api, request->GetAPIVersion(), request->GetAPIMethod())) {
    WEBAPI_LOG("APIRunner.cpp", "Set process name fail[%m]");
    response->SetError(WEBAPI_ERR_PROCESS_NAME);
    return false;
  }
  return true;
}

bool APIRunner::Process(APIRequest* request, APIResponse* response) {
  if (!SetProcessName(request, response) || !CheckRequestParam(request, response) ||
      !AddAPIInfo(request)) {
    return false;
  }
  if (request->HasParam("relay_zt")) {
    response->SetError(WEBAPI_ERR_RELAY_FAILED);
    return false;
  }
  if (rooms_->road != nullptr && !TakesRoad(request)) {
    return false;
  }
  bool result = false;
  if (request->GetAPIClass() == kCompoundAPI) {
    result = ProcessEntry(request, response);
  } else if (CanProcessSocket(request)) {
    result = ProcessSocket(request, response);
  } else {
    result = ProcessLib(request, response);
  }
  private_->ForgetCallName();
  SetProcessName(request, response);
  return result;
}

bool APIRunner::ProcessEntry(APIRequest* request, APIResponse* response) {
  if (request->GetAPIMethod() != kCompoundMethod) {
    return false;
  }
  if (!request->HasParam("compound")) {
    response->SetError(WEBAPI_ERR_NO_COMPOUND);
    return false;
  }
  ++compoundDepth_;
  const bool result = HandleCompound(request, response);
  --compoundDepth_;
  return result;
}

bool APIRunner::HandleCompound(APIRequest* request, APIResponse* response) {
  return CompoundHandler(request, response, this).Process();
}

bool APIRunner::CanProcessSocket(APIRequest* request) {
  return DaemonCall(*this, request).IsPossible();
}

bool APIRunner::ProcessSocket(APIRequest* request, APIResponse* response) {
  if (!IsPermitted(request, response)) {
    return false;
  }
  const CallName call(*request);
  const Json::Value& attributes = GetMethod(call.api, call.version, call.method);
  return TakeUpload(request, response, attributes) &&
         ParamCheck::Passes(*request, *response, attributes) &&
         DaemonCall(*this, request).Run(response);
}

bool APIRunner::ProcessLib(APIRequest* request, APIResponse* response) {
  if (!IsPermitted(request, response)) {
    return false;
  }
  // Copied: a method may have descriptions loaded that take the place of its own.
  const CallName call(*request);
  const Json::Value attributes = GetMethod(call.api, call.version, call.method);
  if (rooms_->road != nullptr) {
    return RunByRoad(request, response, attributes);
  }
  CountCall(request, attributes);
  return TakeUpload(request, response, attributes) &&
         ParamCheck::Passes(*request, *response, attributes) &&
         Execution(*this, request, response).Run(attributes);
}

void APIRunner::CountCall(APIRequest* request, const Json::Value& attributes) {
  if (JsonHelper::asBool(request_->GetAttr("_collector_count_webapi")) &&
      !APIDescription::IsSet(attributes, "allowTimeout") &&
      JsonHelper::asBool(request->GetAPIInfo("count", true))) {
    IncreaseCounter(request);
  }
}

bool APIRunner::TakeUpload(APIRequest* request, APIResponse* response,
                           const Json::Value& attributes) {
  return !request->IsUploadRequest() ||
         (APIDescription::IsSet(attributes, "allowUpload") && HandleUpload(request, response));
}

bool APIRunner::IsPermitted(APIRequest* request, APIResponse* response) {
  bool permitted = true;
  if (request->IsSharing()) {
    permitted = CheckSharingPermission(request, response);
  } else if (NeedPermission(request)) {
    permitted = CheckPermission(request, response);
  }
  return permitted || SkipPermission(request);
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

void APIRunner::IncreaseCounter(APIRequest* request) {
  if (rooms_->road != nullptr) {
    UsageCounter::CountInResident(*request);
  } else {
    UsageCounter::Count(*request);
  }
}

bool APIRunner::HandleCallback(APIResponse* response) {
  return response != nullptr && RunCallbacks(*response);
}

bool APIRunner::CheckLibDescription(const Json::Value& description) const {
  return Catalogue::CheckLibDescription(description);
}

Json::Value& APIRunner::ApplyLibDef(Json::Value& description) const {
  return rooms_->catalogue.ApplyLibDef(description);
}

bool APIRunner::InitLibDesc(Json::Value& target) {
  return rooms_->catalogue.InitLibDesc(target);
}

bool APIRunner::InitLibDesc(Json::Value& target, const std::string& api) {
  return rooms_->catalogue.InitLibDesc(target, api);
}

bool APIRunner::InitLibDesc(Json::Value& target, APIRequest* request) {
  return request != nullptr && InitLibDesc(target, request->GetAPIClass());
}

bool APIRunner::AddAPIInfo(APIRequest* request) {
  return rooms_->catalogue.AddAPIInfo(request);
}

const Json::Value& APIRunner::GetMethod(const std::string& api, int version,
                                        const std::string& method) {
  return rooms_->catalogue.GetMethod(api, version, method);
}

bool APIRunner::GetMethodAttr(const std::string& api, int version, const std::string& method,
                              const std::string& attribute) {
  return rooms_->catalogue.GetMethodAttr(api, version, method, attribute);
}

bool APIRunner::GetMethodAttr(APIRequest* request, const std::string& attribute) {
  if (request == nullptr || attribute.empty()) {
    return false;
  }
  return GetMethodAttr(request->GetAPIClass(), request->GetAPIVersion(), request->GetAPIMethod(),
                       attribute);
}

bool APIRunner::CheckRequestParam(APIRequest* request, APIResponse* response) {
  const int code = rooms_->catalogue.CheckRequestParam(*request);
  if (code != WEBAPI_ERR_NONE) {
    response->SetError(code);
  }
  return code == WEBAPI_ERR_NONE;
}

bool APIRunner::OpenLib(APIRequest* request, _tag_API_TABLE** table,
                        _tag_API_CHECK_TABLE** checkTable) {
  return rooms_->libraries.OpenLib(request, table, checkTable);
}

bool APIRunner::CacheLib(APIRequest* request, void** handle) {
  return rooms_->libraries.CacheLib(request, handle);
}

bool APIRunner::PreloadLibrary(const std::string& path) {
  return PreloadedLibraries::Load(path);
}

void APIRunner::RefreshLibraries() {
  PreloadedLibraries::Refresh();
  MemoryBound::Measure();
}

bool APIRunner::GetTableFunc(void* handle, _tag_API_TABLE** table) {
  return rooms_->libraries.GetTableFunc(handle, table);
}

bool APIRunner::GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** checkTable) {
  return rooms_->libraries.GetCheckTableFunc(handle, checkTable);
}

void APIRunner::CloseLib() {
  rooms_->libraries.CloseLib();
}

}  // namespace QELO
