// QELO.Catalog.API: the APIs, versions and methods that the caller may call.

#include <webapi/APIAuth.h>
#include <webapi/APIDescription.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APIRunner.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>
#include <webapi/MethodDescription.h>
#include <webapi/WebAPIError.h>

#include <algorithm>
#include <string>
#include <vector>

#include "OpenApi.h"

namespace {

using QELO::APIDescription;
using QELO::APIRequest;
using QELO::APIResponse;
using QELO::APIRunner;
namespace JsonHelper = QELO::JsonHelper;

constexpr char kApi[] = "QELO.Catalog.API";

/// Looks descriptions up as a call does, and tells of each what its caller may know. Paths of
/// libraries and sockets stay out.
class Catalogue {
 public:
  /// @param withTexts  tells schemas and texts, too
  Catalogue(const APIRequest& request, bool withTexts) : request_(request), withTexts_(withTexts) {}

  /// Every described API, callable or not.
  Json::Value All() {
    Json::Value all(Json::objectValue);
    runner_.InitLibDesc(all);
    return all;
  }

  /// The APIs whose names begin with a prefix and of which the caller may call something.
  Json::Value Beginning(const std::string& prefix) {
    const Json::Value all = All();
    Json::Value apis(Json::arrayValue);
    for (auto it = all.begin(); it != all.end(); ++it) {
      if (it.name().compare(0, prefix.size(), prefix) != 0) {
        continue;
      }
      const Json::Value api = Describe(it.name());
      if (!api.isNull()) {
        apis.append(api);
      }
    }
    return apis;
  }

  /// One API with the methods that the caller may call; null when there is none.
  Json::Value Describe(const std::string& api) {
    if (!runner_.InitLibDesc(found_, api) || !JsonHelper::hasMember(found_, api)) {
      return Json::Value();
    }
    const Json::Value& description = found_[api];
    const Json::Value methods = Versions(api, description);
    if (methods.empty()) {
      return Json::Value();
    }
    Json::Value result(Json::objectValue);
    result["api"] = api;
    for (const char* key : {"minVersion", "maxVersion", "authLevel", "appPriv", "requestFormat"}) {
      if (JsonHelper::hasMember(description, key)) {
        result[key] = description[key];
      }
    }
    if (!IsForEverybody(description) && JsonHelper::hasMember(description, "allowUser")) {
      result["allowUser"] = description["allowUser"];
    }
    result["methods"] = methods;
    return result;
  }

 private:
  /// Whether nobody is asked who he is, so that "allowUser" means nothing.
  static bool IsForEverybody(const Json::Value& description) {
    return APIDescription(description).GetAuthLevel() == APIDescription::AUTH_NONE;
  }

  Json::Value Versions(const std::string& api, const Json::Value& description) {
    Json::Value versions(Json::objectValue);
    for (const int version : APIDescription(description).Versions()) {
      const Json::Value methods = Methods(api, version, description);
      if (!methods.empty()) {
        versions[std::to_string(version)] = methods;
      }
    }
    return versions;
  }

  Json::Value Methods(const std::string& api, int version, const Json::Value& description) {
    Json::Value methods(Json::objectValue);
    for (const std::string& method : APIDescription(description).Methods(version)) {
      const Json::Value& attributes = runner_.GetMethod(api, version, method);
      if (QELO::APIAuth::MayCall(request_, description, attributes)) {
        methods[method] = Shown(attributes, !IsForEverybody(description));
      }
    }
    return methods;
  }

  /// What of a method's attributes its callers may know.
  Json::Value Shown(const Json::Value& attributes, bool withUsers) const {
    const std::vector<std::string>& texts = QELO::MethodDescription::Keys();
    Json::Value shown(Json::objectValue);
    for (auto it = attributes.begin(); attributes.isObject() && it != attributes.end(); ++it) {
      const bool isText = std::find(texts.begin(), texts.end(), it.name()) != texts.end();
      if (isText ? withTexts_ : it->isBool() || (it.name() == "allowUser" && withUsers)) {
        shown[it.name()] = *it;
      }
    }
    return shown;
  }

  const APIRequest& request_;
  const bool withTexts_;
  APIRunner runner_;
  Json::Value found_ = Json::Value(Json::objectValue);
};

void List(APIRequest* request, APIResponse* response) {
  const std::string prefix = request->GetAndCheckString("prefix", APIRequest::PARAM_OPTIONAL).Get();
  Json::Value data(Json::objectValue);
  data["apis"] = Catalogue(*request, false).Beginning(prefix);
  response->SetSuccess(data);
}

void Describe(APIRequest* request, APIResponse* response) {
  // Not "api", which names the API that is called.
  const auto name = request->GetAndCheckString("name");
  if (name.IsInvalid()) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
    return;
  }
  const Json::Value api = Catalogue(*request, true).Describe(name.Get());
  if (api.isNull()) {
    response->SetError(QELO::WEBAPI_ERR_NO_SUCH_API);
    return;
  }
  response->SetSuccess(api);
}

void Document(APIRequest* request, APIResponse* response) {
  const std::string prefix = request->GetAndCheckString("prefix", APIRequest::PARAM_OPTIONAL).Get();
  response->SetSuccess(OpenApi(Catalogue(*request, true).Beginning(prefix)));
}

QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "list", List},
    {kApi, 1, "describe", Describe},
    {kApi, 1, "openapi", Document},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
