#include "webapi/runner/execution/Execution.h"

#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/base/MemoryBound.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/execution/Credentials.h"
#include "webapi/runner/execution/Fence.h"
#include "webapi/runner/execution/MethodAccount.h"
#include "webapi/runner/execution/Priority.h"
#include "webapi/runner/execution/StandardStreams.h"
#include "webapi/runner/execution/WorkingDirectory.h"

namespace QELO {
namespace {

/// The first entry for the call, or the terminating one.
template <typename Entry>
const Entry& findEntry(const Entry* table, const CallName& call) {
  while (table->api != nullptr && (table->version != call.version || call.api != table->api ||
                                   table->method == nullptr || call.method != table->method)) {
    ++table;
  }
  return *table;
}

/// Asks the library's check function, where there is one for the call.
bool passesCheck(const _tag_API_CHECK_TABLE* table, const CallName& call, APIRequest* request,
                 APIResponse* response) {
  if (table == nullptr) {
    return true;
  }
  const _tag_API_CHECK_TABLE& entry = findEntry(table, call);
  if (entry.check == nullptr) {
    return true;
  }
  bool passed = false;
  if (!Fence("check function", [&] { passed = entry.check(request, response) != 0; })) {
    response->SetError(WEBAPI_ERR_NO_ANSWER);
  }
  return passed;
}

/// Takes the credentials that the description asks for.
/// @param giveBack  receives whether they are given back after the call
bool takeCredentials(APIRequest& request, const Json::Value& attributes, bool* giveBack) {
  const bool keepPrivilege = APIDescription::IsSet(attributes, "grantable");
  *giveBack = keepPrivilege;
  if (APIDescription::IsSet(attributes, "grantByDefault")) {
    *giveBack = true;
    if (!Credentials::BecomeRoot()) {
      WEBAPI_LOG("APIRunner.cpp", "grantByDefault failed. [%m]");
      return false;
    }
    return true;
  }
  const std::string account = MethodAccount(request, attributes);
  if (APIDescription::IsSet(attributes, "grantByUser")) {
    if (account.empty()) {
      WEBAPI_LOG("APIRunner.cpp", "grantByUser: failed to get login username.");
      return false;
    }
    if (!Credentials::BecomeUser(account, keepPrivilege)) {
      WEBAPI_LOG("APIRunner.cpp", "grantByUser failed. [%m]");
      return false;
    }
    return true;
  }
  if (!Credentials::BecomeUser(account, keepPrivilege)) {
    WEBAPI_LOG("APIRunner.cpp", "grantable failed. [%m]");
    return false;
  }
  return true;
}

bool callFunction(const _tag_API_TABLE& entry, APIRequest* request, APIResponse* response) {
  response->SetError(WEBAPI_ERR_NO_ANSWER);
  const bool returned = Fence("method", [&] { entry.function(request, response); });
  if (!returned) {
    response->SetError(WEBAPI_ERR_NO_ANSWER);
  }
  return returned;
}

/// Calls the method with the credentials that its description asks for.
bool callMethod(const _tag_API_TABLE& entry, const Json::Value& attributes, APIRequest* request,
                APIResponse* response) {
  response->SetError(WEBAPI_ERR_NO_ANSWER);
  Credentials saved;
  bool giveBack = false;
  if (!saved.Save()) {
    return false;
  }
  if (!takeCredentials(*request, attributes, &giveBack)) {
    if (saved.HaveChanged()) {  // root was regained on the way
      saved.GiveBack();
    }
    return false;
  }
  const bool returned = callFunction(entry, request, response);
  if (giveBack) {
    saved.GiveBack();
  }
  return returned;
}

}  // namespace

bool Execution::Run(const Json::Value& attributes) {
  MemoryBound::Lift();
  if (Credentials::AreLost()) {
    WEBAPI_LOG("APIRunner.cpp", "not called: the process has credentials of a call before");
    response_->SetError(WEBAPI_ERR_NO_ANSWER);
    return false;
  }
  // Loading is within the guards: a library's constructors are foreign code too. They end in
  // reverse order, streams before priority before directory.
  const WorkingDirectory directory;
  if (!directory.IsSaved()) {
    WEBAPI_LOG("APIRunner.cpp", "cannot keep the working directory. [%m]");
    response_->SetError(WEBAPI_ERR_NO_ANSWER);
    return false;
  }
  Priority priority;
  const StandardStreams streams(!APIDescription::IsSet(attributes, "allowUpload"),
                                !APIDescription::IsSet(attributes, "allowDownload"));
  if (!streams.IsShut()) {
    WEBAPI_LOG("APIRunner.cpp", "cannot shut the standard streams. [%m]");
    response_->SetError(WEBAPI_ERR_NO_ANSWER);
    return false;
  }
  _tag_API_TABLE* table = nullptr;
  _tag_API_CHECK_TABLE* checkTable = nullptr;
  if (!runner_.OpenLib(request_, &table, &checkTable) || table == nullptr) {
    response_->SetError(WEBAPI_ERR_NO_LIBRARY);
    return false;
  }
  const CallName call(*request_);
  priority.Set(
      JsonHelper::asInt(request_->GetAPIInfoRef("priority", Json::Value::nullSingleton())));
  if (!passesCheck(checkTable, call, request_, response_)) {
    return false;
  }
  const _tag_API_TABLE& entry = findEntry(table, call);
  if (entry.api == nullptr || entry.function == nullptr) {
    response_->SetError(WEBAPI_ERR_METHOD_MISSING);
    return false;
  }
  return account_ == Account::kTaken ? callFunction(entry, request_, response_)
                                     : callMethod(entry, attributes, request_, response_);
}

}  // namespace QELO
