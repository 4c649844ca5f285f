// The runner's catalogue: description files are found, checked, given their defaults and asked
// for methods and attributes.

#include <errno.h>
#include <glob.h>

#include <string_view>

#include "webapi/APIRequest.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

constexpr int kMaxPriority = 10;
constexpr int kMaxCandidates = 4;

/// API names become file names, and clients choose them: nothing that leads out of the directory,
/// and nothing that ends a path before its suffix.
bool isFileName(const std::string& api) {
  return api.find_first_of(std::string_view("/\0", 2)) == std::string::npos;
}

/// Whether members can be put into a value; the JSON library throws where they cannot.
bool takesMembers(const Json::Value& value) {
  return value.isObject() || value.isNull();
}

/// The description file of an API: of QELO.A.lib, QELO.A.B.lib, ... the longest that exists.
std::string descriptionFile(const std::string& api) {
  std::string found;
  size_t dot = api.find('.');
  for (int candidate = 0; candidate < kMaxCandidates; ++candidate) {
    dot = dot == std::string::npos ? dot : api.find('.', dot + 1);
    const std::string file = api.substr(0, dot) + ".lib";
    if (QLIBCFileExist(file.c_str()) == 1) {
      found = file;
    }
    if (dot == std::string::npos) {
      break;
    }
  }
  return found;
}

}  // namespace

bool APIRunner::CheckLibDescription(const Json::Value& description) const {
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

Json::Value& APIRunner::ApplyLibDef(Json::Value& description) const {
  if (!takesMembers(description)) {
    return description;
  }
  for (const char* key : {"authLevel", "allowUser", "requestFormat", "priority"}) {
    if (!JsonHelper::hasMember(description, key)) {
      description[key] = key == std::string("requestFormat") ? Json::Value("JSON")
                                                             : JsonHelper::member(libDef, key);
    }
  }
  return description;
}

void APIRunner::AddDescriptions(Json::Value& target, Json::Value& file) const {
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

bool APIRunner::InitLibDesc(Json::Value& target) {
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

bool APIRunner::InitLibDesc(Json::Value& target, const std::string& api) {
  if (api.empty()) {
    return false;
  }
  if (JsonHelper::hasMember(target, api)) {
    return true;
  }
  const std::string path = isFileName(api) ? descriptionFile(api) : "";
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

bool APIRunner::InitLibDesc(Json::Value& target, APIRequest* request) {
  return request != nullptr && InitLibDesc(target, request->GetAPIClass());
}

bool APIRunner::AddAPIInfo(APIRequest* request) {
  if (request == nullptr || !JsonHelper::hasMember(catalogue, request->GetAPIClass())) {
    return false;
  }
  request->InitAPIInfo(catalogue[request->GetAPIClass()]);
  return true;
}

const Json::Value& APIRunner::GetMethod(const std::string& api, int version,
                                        const std::string& method) {
  const Json::Value& defaults = JsonHelper::member(libDef, "methods");
  if (!InitLibDesc(catalogue, api)) {
    return defaults;
  }
  const Json::Value& versions = JsonHelper::member(JsonHelper::member(catalogue, api), "methods");
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

const Json::Value& APIRunner::GetAttributes(const std::string& api, int version,
                                            const std::string& method) {
  const Json::Value& attributes = GetMethod(api, version, method);
  return attributes.isObject() ? attributes : JsonHelper::member(libDef, "methods");
}

bool APIRunner::GetMethodAttr(const std::string& api, int version, const std::string& method,
                              const std::string& attribute) {
  return JsonHelper::asBool(JsonHelper::member(GetAttributes(api, version, method), attribute));
}

bool APIRunner::GetMethodAttr(APIRequest* request, const std::string& attribute) {
  if (request == nullptr || attribute.empty()) {
    return false;
  }
  return GetMethodAttr(request->GetAPIClass(), request->GetAPIVersion(), request->GetAPIMethod(),
                       attribute);
}

}  // namespace QELO
