// The runner's dispatch: a request is checked against the catalogue and sent down its road;
// callbacks run after the answer.

#include <unistd.h>

#include <algorithm>
#include <cstdio>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/CompoundHandler.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/platform/Core.h"
#include "webapi/runner/CompoundCall.h"
#include "webapi/runner/execution/Fence.h"

namespace QELO {
namespace {

/// The answer goes first: callbacks may restart the server that carries it.
constexpr unsigned kCallbackDelaySeconds = 1;

/// Whether a version's entries list the method, as a plain string or as a member of an object.
bool isListed(const Json::Value& entries, const std::string& method) {
  return entries.isArray() &&
         std::any_of(entries.begin(), entries.end(), [&](const Json::Value& entry) {
           return entry == Json::Value(method) || JsonHelper::hasMember(entry, method);
         });
}

}  // namespace

bool APIRunner::Process(APIRequest* request, APIResponse* response) {
  if (!SetProcessName(request, response) || !CheckRequestParam(request, response) ||
      !AddAPIInfo(request)) {
    return false;
  }
  if (request->HasParam("relay_zt")) {
    response->SetError(WEBAPI_ERR_RELAY_FAILED);
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

bool APIRunner::CheckRequestParam(APIRequest* request, APIResponse* response) {
  const auto refuse = [response](int code) {
    response->SetError(code);
    return false;
  };
  const std::string api = request->GetAPIClass();
  const int version = request->GetAPIVersion();
  const std::string method = request->GetAPIMethod();
  if (api.empty() || version < 1 || method.empty()) {
    return refuse(WEBAPI_ERR_BAD_REQUEST);
  }
  if (!InitLibDesc(catalogue, request) || !JsonHelper::hasMember(catalogue, api)) {
    return refuse(WEBAPI_ERR_NO_SUCH_API);
  }
  const Json::Value& description = catalogue[api];
  if (version < JsonHelper::asInt(description["minVersion"]) ||
      version > JsonHelper::asInt(description["maxVersion"])) {
    return refuse(WEBAPI_ERR_NO_SUCH_VERSION);
  }
  if (!isListed(JsonHelper::member(description["methods"], std::to_string(version)), method)) {
    return refuse(WEBAPI_ERR_NO_SUCH_METHOD);
  }
  if (!GetMethodAttr(api, version, method, "allowUpload") && request->IsUploadRequest()) {
    return refuse(WEBAPI_ERR_UPLOAD_REFUSED);
  }
  if (!GetMethodAttr(api, version, method, "allowDemo") && request->IsDemoMode()) {
    return refuse(WEBAPI_ERR_DEMO_REFUSED);
  }
  return true;
}

bool APIRunner::HandleCallback(APIResponse* response) {
  if (response == nullptr || response->GetCallbackFuncs() == nullptr ||
      response->GetCallbackFuncs()->empty()) {
    return false;
  }
  const pid_t child = QLIBCProcFork();
  if (child != 0) {
    return child > 0;
  }
  setsid();
  for (unsigned left = kCallbackDelaySeconds; left > 0;) {
    left = sleep(left);  // shortened by signals
  }
  for (const auto& [function, argument] : *response->GetCallbackFuncs()) {
    Fence("callback", [call = function, value = argument] { call(value); });
  }
  // Not exit(): what the parent registered to do at its end is the parent's.
  fflush(nullptr);
  _exit(0);
}

bool APIRunner::CanProcessSocket(APIRequest*) {
  return false;  // no daemon is served yet
}

bool APIRunner::ProcessSocket(APIRequest*, APIResponse* response) {
  response->SetError(WEBAPI_ERR_NO_ANSWER);
  return false;
}

}  // namespace QELO
