#include "webapi/APIDescription.h"

#include <algorithm>

#include "webapi/JsonHelper.h"
#include "webapi/runner/catalogue/DescriptionKeys.h"

namespace QELO {
namespace {

using DescriptionKeys::kMaxPriority;

constexpr char kDefaultRunAs[] = "system";

}  // namespace

std::string APIDescription::Fault() const {
  if (!description_.isObject()) {
    return "it is no object";
  }
  if (!JsonHelper::member(description_, "lib").isString()) {
    return "\"lib\" is no string";
  }
  for (const char* key : {"minVersion", "maxVersion"}) {
    if (!JsonHelper::member(description_, key).isInt()) {
      return std::string("\"") + key + "\" is no integer";
    }
  }
  if (!JsonHelper::member(description_, "methods").isObject()) {
    return "\"methods\" is no object";
  }
  const Json::Value* priority = JsonHelper::find(description_, "priority");
  if (priority != nullptr && (!priority->isInt() || priority->asInt() > kMaxPriority ||
                              priority->asInt() < -kMaxPriority)) {
    return "\"priority\" is no integer from -10 to 10";
  }
  return "";
}

bool APIDescription::HasVersion(int version) const {
  return version >= JsonHelper::asInt(JsonHelper::member(description_, "minVersion")) &&
         version <= JsonHelper::asInt(JsonHelper::member(description_, "maxVersion"));
}

std::vector<int> APIDescription::Versions() const {
  std::vector<int> versions;
  const Json::Value& listed = JsonHelper::member(description_, "methods");
  for (auto it = listed.begin(); listed.isObject() && it != listed.end(); ++it) {
    const int version = JsonHelper::asInt(it.name());
    // "01" is found by nobody.
    if (version > 0 && HasVersion(version) && it->isArray() &&
        std::to_string(version) == it.name()) {
      versions.push_back(version);
    }
  }
  std::sort(versions.begin(), versions.end());
  return versions;
}

const Json::Value& APIDescription::Entries(int version) const {
  const Json::Value& entries =
      JsonHelper::member(JsonHelper::member(description_, "methods"), std::to_string(version));
  return entries.isArray() ? entries : Json::Value::nullSingleton();
}

bool APIDescription::Lists(int version, const std::string& method) const {
  const Json::Value& entries = Entries(version);
  const Json::Value name(method);
  return std::any_of(entries.begin(), entries.end(), [&](const Json::Value& entry) {
    return entry == name || JsonHelper::hasMember(entry, method);
  });
}

std::vector<std::string> APIDescription::Methods(int version) const {
  std::vector<std::string> methods;
  const auto add = [&methods](const std::string& method) {
    if (std::find(methods.begin(), methods.end(), method) == methods.end()) {
      methods.push_back(method);
    }
  };
  for (const Json::Value& entry : Entries(version)) {
    if (entry.isString()) {
      add(entry.asString());
    }
    for (auto it = entry.begin(); entry.isObject() && it != entry.end(); ++it) {
      add(it.name());
    }
  }
  return methods;
}

const Json::Value* APIDescription::Attributes(int version, const std::string& method) const {
  for (const Json::Value& entry : Entries(version)) {
    if (entry.isObject() && !entry.empty() && entry.begin().name() == method) {
      return &*entry.begin();
    }
  }
  return nullptr;
}

bool APIDescription::IsSet(const Json::Value& attributes, std::string_view attribute) {
  return JsonHelper::asBool(JsonHelper::member(attributes, attribute));
}

bool APIDescription::SharesProcess(const Json::Value& attributes) {
  return JsonHelper::isText(JsonHelper::member(attributes, "isolation"), "worker");
}

int APIDescription::GetAuthLevel() const {
  const Json::Value& level = JsonHelper::member(description_, "authLevel");
  const bool isInteger = level.type() == Json::intValue || level.type() == Json::uintValue;
  return isInteger ? JsonHelper::asInt(level, AUTH_LOGIN) : AUTH_LOGIN;
}

const Json::Value& APIDescription::GetAllowUser(const Json::Value& attributes) const {
  const Json::Value* own = JsonHelper::find(attributes, "allowUser");
  return own != nullptr ? *own : JsonHelper::member(description_, "allowUser");
}

const Json::Value& APIDescription::GetAppPriv() const {
  return JsonHelper::member(description_, "appPriv");
}

std::string APIDescription::GetRunAs(const Json::Value& attributes) const {
  const Json::Value* runAs = JsonHelper::find(attributes, "runAs");
  if (runAs == nullptr) {
    runAs = JsonHelper::find(description_, "runAs");
  }
  return runAs != nullptr ? JsonHelper::asString(*runAs) : kDefaultRunAs;
}

}  // namespace QELO
