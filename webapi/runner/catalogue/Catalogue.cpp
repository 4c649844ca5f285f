#include "webapi/runner/catalogue/Catalogue.h"

#include <errno.h>
#include <glob.h>

#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/DescriptionFile.h"
#include "webapi/base/Log.h"
#include "webapi/base/OwnFile.h"
#include "webapi/json/Fault.h"
#include "webapi/json/Literal.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Paths.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

constexpr const char* kRequestFormat = "requestFormat";

/// Says, beside that a file is not valid, where it is wrong.
void logFault(const std::string& path) {
  JsonHelper::Position fault;
  if (JsonHelper::findFileFault(path, fault)) {
    WEBAPI_LOG("APIRunner.cpp", "%s:%zu:%zu: no JSON from here on", LogText(path).c_str(),
               fault.line, fault.column);
  }
}

/// Whether members can be put into a value; the JSON library throws where they cannot.
bool takesMembers(const Json::Value& value) {
  return value.isObject() || value.isNull();
}

}  // namespace

void Catalogue::ReadLibDef(Json::Value& libDef) {
  Json::Value defaults;
  if (!ReadFile(Paths::kLibDef, defaults)) {
    logFault(Paths::kLibDef);
  } else if (!defaults.isObject()) {
    WEBAPI_LOG("APIRunner.cpp", "%s: it is no object", Paths::kLibDef);
  } else {
    libDef.swap(defaults);
  }
}

bool Catalogue::ReadFile(const std::string& path, Json::Value& content) {
  if (OthersMayChange(path)) {
    WEBAPI_LOG("APIRunner.cpp", "refused to read %s: others may write it or its directory",
               LogText(path).c_str());
    return false;
  }
  return WebAPIUtil::ReadJsonFile(path, content);
}

bool Catalogue::CheckLibDescription(const Json::Value& description) {
  return APIDescription(description).Fault().empty();
}

Json::Value& Catalogue::ApplyLibDef(Json::Value& description) const {
  if (!takesMembers(description)) {
    return description;
  }
  for (const char* key : {"authLevel", "allowUser", kRequestFormat, "priority"}) {
    if (!JsonHelper::hasMember(description, key)) {
      description[Literal(key)] =
          key == kRequestFormat ? Json::Value("JSON") : JsonHelper::member(libDef_, key);
    }
  }
  return description;
}

void Catalogue::AddDescriptions(Json::Value& target, Json::Value& file) const {
  if (!file.isObject() || !takesMembers(target)) {
    return;
  }
  for (auto it = file.begin(); it != file.end(); ++it) {
    const std::string fault = APIDescription(*it).Fault();
    if (!fault.empty()) {
      WEBAPI_LOG("APIRunner.cpp", "WebAPI description %s is not valid.",
                 LogText(it.name()).c_str());
      WEBAPI_LOG("APIRunner.cpp", "description %s: %s", LogText(it.name()).c_str(),
                 LogText(fault).c_str());
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
    if (ReadFile(files.gl_pathv[i], file)) {
      AddDescriptions(target, file);
    } else {
      logFault(files.gl_pathv[i]);
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
  if (!ReadFile(path, file)) {
    WEBAPI_LOG("APIRunner.cpp", "WebAPI description file %s is not valid", LogText(path).c_str());
    logFault(path);
    return false;
  }
  AddDescriptions(target, file);
  return true;
}

bool Catalogue::AddAPIInfo(APIRequest* request) const {
  const Json::Value* description =
      request != nullptr ? JsonHelper::find(known_, request->GetAPIClass()) : nullptr;
  if (description == nullptr) {
    return false;
  }
  request->InitAPIInfo(*description);
  return true;
}

const Json::Value& Catalogue::GetMethod(const std::string& api, int version,
                                        const std::string& method) {
  const Json::Value& defaults = JsonHelper::member(libDef_, "methods");
  const Json::Value* description = JsonHelper::find(known_, api);
  if (description == nullptr && InitLibDesc(known_, api)) {
    description = JsonHelper::find(known_, api);
  }
  if (description == nullptr) {
    return defaults;
  }
  const Json::Value* own = APIDescription(*description).Attributes(version, method);
  return own != nullptr ? *own : defaults;
}

bool Catalogue::GetMethodAttr(const std::string& api, int version, const std::string& method,
                              const std::string& attribute) {
  const Json::Value& own = GetMethod(api, version, method);
  const Json::Value& attributes = own.isObject() ? own : JsonHelper::member(libDef_, "methods");
  return APIDescription::IsSet(attributes, attribute);
}

int Catalogue::CheckRequestParam(APIRequest& request) {
  const std::string api = request.GetAPIClass();
  const int version = request.GetAPIVersion();
  const std::string method = request.GetAPIMethod();
  if (api.empty() || version < 1 || method.empty()) {
    return WEBAPI_ERR_BAD_REQUEST;
  }
  const Json::Value* found = InitLibDesc(known_, api) ? JsonHelper::find(known_, api) : nullptr;
  if (found == nullptr) {
    return WEBAPI_ERR_NO_SUCH_API;
  }
  const APIDescription description(*found);
  if (!description.HasVersion(version)) {
    return WEBAPI_ERR_NO_SUCH_VERSION;
  }
  if (!description.Lists(version, method)) {
    return WEBAPI_ERR_NO_SUCH_METHOD;
  }
  const Json::Value& attributes = GetMethod(api, version, method);
  if (!APIDescription::IsSet(attributes, "allowUpload") && request.IsUploadRequest()) {
    return WEBAPI_ERR_UPLOAD_REFUSED;
  }
  if (!APIDescription::IsSet(attributes, "allowDemo") && request.IsDemoMode()) {
    return WEBAPI_ERR_DEMO_REFUSED;
  }
  return WEBAPI_ERR_NONE;
}

}  // namespace QELO
