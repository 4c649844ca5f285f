#include "webapi/runner/catalogue/Catalogue.h"

#include <errno.h>
#include <glob.h>

#include <algorithm>
#include <string_view>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/DescriptionFile.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

constexpr int kMaxPriority = 10;

/// Whether members can be put into a value; the JSON library throws where they cannot.
bool takesMembers(const Json::Value& value) {
  return value.isObject() || value.isNull();
}

/// Whether a version's entries list the method, as a plain string or as a member of an object.
bool isListed(const Json::Value& entries, const std::string& method) {
  return entries.isArray() &&
         std::any_of(entries.begin(), entries.end(), [&](const Json::Value& entry) {
           return entry == Json::Value(method) || JsonHelper::hasMember(entry, method);
         });
}

bool isSet(const Json::Value& attributes, const char* name) {
  return JsonHelper::asBool(JsonHelper::member(attributes, name));
}

}  // namespace

bool Catalogue::CheckLibDescription(const Json::Value& description) {
  if (!description.isObject()) {
    return false;
  }
  if (!JsonHelper::member(description, "lib").isString() ||
      !JsonHelper::member(description, "minVersion").isInt() ||
      !JsonHelper::member(description, "maxVersion").isInt() ||
      !JsonHelper::member(description, "methods").isObject()) {
    return false;
  }
  if (!JsonHelper::hasMember(description, "priority")) {
    return true;
  }
  const Json::Value& priority = description["priority"];
  return priority.isInt() && priority.asInt() <= kMaxPriority && priority.asInt() >= -kMaxPriority;
}

Json::Value& Catalogue::ApplyLibDef(Json::Value& description) const {
  if (!takesMembers(description)) {
    return description;
  }
  for (const char* key : {"authLevel", "allowUser", "requestFormat", "priority"}) {
    if (!JsonHelper::hasMember(description, key)) {
      description[key] = key == std::string("requestFormat") ? Json::Value("JSON")
                                                             : JsonHelper::member(libDef_, key);
    }
  }
  return description;
}

void Catalogue::AddDescriptions(Json::Value& target, Json::Value& file) const {
  if (!file.isObject() || !takesMembers(target)) {
    return;
  }
  for (auto it = file.begin(); it != file.end(); ++it) {
    if (!CheckLibDescription(*it)) {
      WEBAPI_LOG("APIRunner.cpp", "WebAPI description %s is not valid.", it.name().c_str());
      continue;
    }
    ApplyLibDef(*it);
    target[it.name()].swap(*it);
  }
}

bool Catalogue::InitLibDesc(Json::Value& target) const {
  glob_t files{};
  if (glob("*.lib", 0, nullptr, &files) != 0) {
    globfree(&files);
    return false;
  }
  for (size_t i = 0; i < files.gl_pathc; ++i) {
    Json::Value file;
    if (WebAPIUtil::ReadJsonFile(files.gl_pathv[i], file)) {
      AddDescriptions(target, file);
    }
  }
  globfree(&files);
  return true;
}

bool Catalogue::InitLibDesc(Json::Value& target, const std::string& api) const {
  if (api.empty()) {
    return false;
  }
  if (JsonHelper::hasMember(target, api)) {
    return true;
  }
  const std::string path = DescriptionFile(
      api, [](const std::string& file) { return QLIBCFileExist(file.c_str()) == 1; });
  if (path.empty()) {
    WEBAPI_LOG("APIRunner.cpp", "WebAPI %s is not valid", LogText(api).c_str());
    return false;
  }
  errno = 0;
  Json::Value file;
  if (!WebAPIUtil::ReadJsonFile(path, file)) {
    WEBAPI_LOG("APIRunner.cpp", "WebAPI description file %s is not valid", path.c_str());
    return false;
  }
  AddDescriptions(target, file);
  return true;
}

bool Catalogue::AddAPIInfo(APIRequest* request) const {
  if (request == nullptr || !JsonHelper::hasMember(known_, request->GetAPIClass())) {
    return false;
  }
  request->InitAPIInfo(known_[request->GetAPIClass()]);
  return true;
}

const Json::Value& Catalogue::GetMethod(const std::string& api, int version,
                                        const std::string& method) {
  const Json::Value& defaults = JsonHelper::member(libDef_, "methods");
  if (!InitLibDesc(known_, api)) {
    return defaults;
  }
  const Json::Value& versions = JsonHelper::member(JsonHelper::member(known_, api), "methods");
  const Json::Value& entries = JsonHelper::member(versions, std::to_string(version));
  if (!entries.isArray()) {
    return defaults;
  }
  for (const Json::Value& entry : entries) {
    if (entry.isObject() && !entry.empty() && entry.begin().name() == method) {
      return *entry.begin();
    }
  }
  return defaults;
}

bool Catalogue::GetMethodAttr(const std::string& api, int version, const std::string& method,
                              const std::string& attribute) {
  const Json::Value& own = GetMethod(api, version, method);
  const Json::Value& attributes = own.isObject() ? own : JsonHelper::member(libDef_, "methods");
  return JsonHelper::asBool(JsonHelper::member(attributes, attribute));
}

int Catalogue::CheckRequestParam(APIRequest& request) {
  const std::string api = request.GetAPIClass();
  const int version = request.GetAPIVersion();
  const std::string method = request.GetAPIMethod();
  if (api.empty() || version < 1 || method.empty()) {
    return WEBAPI_ERR_BAD_REQUEST;
  }
  if (!InitLibDesc(known_, api) || !JsonHelper::hasMember(known_, api)) {
    return WEBAPI_ERR_NO_SUCH_API;
  }
  const Json::Value& description = known_[api];
  if (version < JsonHelper::asInt(description["minVersion"]) ||
      version > JsonHelper::asInt(description["maxVersion"])) {
    return WEBAPI_ERR_NO_SUCH_VERSION;
  }
  if (!isListed(JsonHelper::member(description["methods"], std::to_string(version)), method)) {
    return WEBAPI_ERR_NO_SUCH_METHOD;
  }
  const Json::Value& attributes = GetMethod(api, version, method);
  if (!isSet(attributes, "allowUpload") && request.IsUploadRequest()) {
    return WEBAPI_ERR_UPLOAD_REFUSED;
  }
  if (!isSet(attributes, "allowDemo") && request.IsDemoMode()) {
    return WEBAPI_ERR_DEMO_REFUSED;
  }
  return WEBAPI_ERR_NONE;
}

}  // namespace QELO
