#include "webapi/runner/execution/ParamCheck.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <utility>
#include <vector>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Schema.h"
#include "webapi/runner/CallName.h"

namespace QELO::ParamCheck {
namespace {

/// What the framework itself takes, beside all names that begin with "_".
constexpr const char* kOwn[] = {"api",      "version",       "method", "tid",
                                "relay_zt", "relay_timeout", "webapi", "client_time"};

constexpr char kSentTexts[] = "_sent_texts";

bool isOwn(const std::string& name) {
  return name.substr(0, 1) == "_" ||
         std::find(std::begin(kOwn), std::end(kOwn), name) != std::end(kOwn);
}

/// Moves members that the schema does not know from one object to another.
void moveOwn(const Json::Value& schema, Json::Value& from, Json::Value& to) {
  const Json::Value& declared = JsonHelper::member(schema, "properties");
  std::vector<std::string> names;
  for (auto it = from.begin(); it != from.end(); ++it) {
    const std::string name = it.name();
    if (isOwn(name) && !JsonHelper::hasMember(declared, name)) {
      names.push_back(name);
    }
  }
  for (const std::string& name : names) {
    to[name].swap(from[name]);
    from.removeMember(name);
  }
}

Json::Value asJson(const std::vector<Schema::Fault>& faults) {
  Json::Value list(Json::arrayValue);
  for (const Schema::Fault& fault : faults) {
    Json::Value told(Json::objectValue);
    told["path"] = fault.path;
    told["rule"] = fault.rule;
    told["message"] = fault.message;
    list.append(std::move(told));
  }
  return list;
}

bool refuseSchema(const APIRequest& request, APIResponse& response, const Schema::Fault& fault) {
  const CallName call(request);
  WEBAPI_LOG("APIRunner.cpp", "description %s: params of %s are no schema: %s: %s",
             LogText(call.api).c_str(), LogText(call.method).c_str(), LogText(fault.path).c_str(),
             LogText(fault.message).c_str());
  response.SetError(WEBAPI_ERR_NO_SUCH_METHOD);
  return false;
}

/// The texts that parameters came as: those that were kept, or that the program which makes the
/// call has left with it.
Json::Value sentTexts(const APIRequest& request) {
  Json::Value texts = request.GetAttr(kSentTexts, Json::Value());
  if (!texts.isObject()) {
    return request.GetSentTexts();
  }
  return texts;
}

bool check(APIRequest& request, APIResponse& response, const Json::Value& schema) {
  const Json::Value* type = JsonHelper::find(schema, "type");
  if (!schema.isObject()) {
    return refuseSchema(request, response, {"", "type", "it is no object"});
  }
  if (type != nullptr && !JsonHelper::isText(*type, "object")) {
    return refuseSchema(request, response, {"/type", "type", "it is not \"object\""});
  }
  Json::Value& params = request.Serialize()["param"];
  if (!params.isObject()) {
    params = Json::Value(Json::objectValue);
  }
  const Json::Value sent = sentTexts(request);
  Json::Value own(Json::objectValue);
  std::vector<Schema::Fault> faults;
  moveOwn(schema, params, own);
  const Schema::Verdict verdict = Schema::Apply(schema, sent, params, faults);
  for (auto it = own.begin(); it != own.end(); ++it) {
    params[it.name()].swap(*it);
  }
  switch (verdict) {
    case Schema::Verdict::kFits:
      return true;
    case Schema::Verdict::kFaulty:
      response.SetError(WEBAPI_ERR_BAD_REQUEST, asJson(faults));
      return false;
    case Schema::Verdict::kNoSchema:
      return refuseSchema(request, response, faults.front());
    default:
      response.SetError(WEBAPI_ERR_NO_ANSWER);
      return false;
  }
}

}  // namespace

bool Passes(APIRequest& request, APIResponse& response, const Json::Value& attributes) {
  const Json::Value* schema = JsonHelper::find(attributes, "params");
  const bool passes = schema == nullptr || check(request, response, *schema);
  request.ForgetSentTexts();
  return passes;
}

}  // namespace QELO::ParamCheck
