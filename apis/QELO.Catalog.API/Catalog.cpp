// QELO.Catalog.API: the APIs, versions and methods that the caller may call.

#include <webapi/APIAuth.h>
#include <webapi/APIDescription.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APIRunner.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>
#include <webapi/WebAPIError.h>

#include <string>

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
  explicit Catalogue(const APIRequest& request) : request_(request) {}

  /// Every described API, callable or not.
  Json::Value All() {
    Json::Value all(Json::objectValue);
    runner_.InitLibDesc(all);
    return all;
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
  static Json::Value Shown(const Json::Value& attributes, bool withUsers) {
    Json::Value shown(Json::objectValue);
    for (auto it = attributes.begin(); attributes.isObject() && it != attributes.end(); ++it) {
      if (it->isBool() || (it.name() == "allowUser" && withUsers)) {
        shown[it.name()] = *it;
      }
    }
    return shown;
  }

  const APIRequest& request_;
  APIRunner runner_;
  Json::Value found_ = Json::Value(Json::objectValue);
};

void List(APIRequest* request, APIResponse* response) {
  const std::string prefix = request->GetAndCheckString("prefix", APIRequest::PARAM_OPTIONAL).Get();
  Catalogue catalogue(*request);
  const Json::Value all = catalogue.All();
  Json::Value apis(Json::arrayValue);
  for (auto it = all.begin(); it != all.end(); ++it) {
    if (it.name().compare(0, prefix.size(), prefix) != 0) {
      continue;
    }
    const Json::Value api = catalogue.Describe(it.name());
    if (!api.isNull()) {
      apis.append(api);
    }
  }
  Json::Value data(Json::objectValue);
  data["apis"] = apis;
  response->SetSuccess(data);
}

void Describe(APIRequest* request, APIResponse* response) {
  // Not "api", which names the API that is called.
  const auto name = request->GetAndCheckString("name");
  if (name.IsInvalid()) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
    return;
  }
  const Json::Value api = Catalogue(*request).Describe(name.Get());
  if (api.isNull()) {
    response->SetError(QELO::WEBAPI_ERR_NO_SUCH_API);
    return;
  }
  response->SetSuccess(api);
}

QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "list", List},
    {kApi, 1, "describe", Describe},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
