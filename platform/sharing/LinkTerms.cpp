#include "platform/sharing/LinkTerms.h"

#include <algorithm>
#include <string_view>

#include "webapi/JsonHelper.h"

namespace QELO::Platform {
namespace {

constexpr size_t kLongestName = 128;         // bytes
constexpr size_t kLongestPath = 4096;        // bytes
constexpr size_t kLongestPassword = 128;     // bytes
constexpr int64_t kMost = int64_t{1} << 53;  // a number that a client's JSON holds exactly
constexpr const char* kProtections[] = {"none", "session", "owner"};

bool takeText(const Json::Value& value, size_t longest, std::string& text) {
  if (value.type() != Json::stringValue) {
    return false;
  }
  const std::string given = JsonHelper::asString(value);
  const bool isPlain = std::none_of(given.begin(), given.end(),
                                    [](unsigned char c) { return c < 0x20 || c == 0x7F; });
  if (!isPlain || given.size() > longest) {
    return false;
  }
  text = given;
  return true;
}

bool takeNumber(const Json::Value& value, int64_t& number) {
  if (!value.isInt64() || value.asInt64() < 0 || value.asInt64() > kMost) {
    return false;
  }
  number = value.asInt64();
  return true;
}

bool takeSwitch(const Json::Value& value, bool& on) {
  if (value.type() != Json::booleanValue) {
    return false;
  }
  on = JsonHelper::asBool(value);
  return true;
}

bool takeProtection(const Json::Value& value, int& type) {
  const std::string name = value.type() == Json::stringValue ? JsonHelper::asString(value) : "";
  const auto* found = std::find(std::begin(kProtections), std::end(kProtections), name);
  if (found == std::end(kProtections)) {
    return false;
  }
  type = static_cast<int>(found - std::begin(kProtections));
  return true;
}

bool takeTerm(std::string_view name, const Json::Value& value, StoredLink& link,
              Json::Value& password) {
  std::string text;
  if (name == "name") {
    return takeText(value, kLongestName, link.name);
  }
  if (name == "path") {
    return takeText(value, kLongestPath, link.entry.path);
  }
  if (name == "protect") {
    return takeProtection(value, link.entry.protectType);
  }
  if (name == "password") {
    password = value;
    return takeText(value, kLongestPassword, text);
  }
  if (name == "matchAddress") {
    return takeSwitch(value, link.entry.enableMatchIp);
  }
  if (name == "upload") {
    return takeSwitch(value, link.entry.allowUpload);
  }
  if (name == "expires") {
    return takeNumber(value, link.expires);
  }
  if (name == "maxUses") {
    return takeNumber(value, link.maxUses);
  }
  return name == "maxBytes" && takeNumber(value, link.maxBytes);
}

}  // namespace

bool takeTerms(const Json::Value& terms, StoredLink& link, Json::Value& password) {
  if (terms.type() != Json::objectValue) {
    return false;
  }
  for (auto term = terms.begin(); term != terms.end(); ++term) {
    if (!takeTerm(term.name(), *term, link, password)) {
      return false;
    }
  }
  const bool hasPassword =
      password.isNull() ? !link.password.empty() : !JsonHelper::asString(password).empty();
  return link.entry.protectType != sharing::SHARING_PROTECT_NONE ||
         (!hasPassword && link.maxUses == 0);
}

Json::Value toJson(const StoredLink& link) {
  Json::Value shown(Json::objectValue);
  shown["id"] = Json::Int64{link.entry.id};
  shown["project"] = link.entry.projectName;
  shown["name"] = link.name;
  shown["path"] = link.entry.path;
  const size_t type = static_cast<size_t>(link.entry.protectType);
  shown["protect"] = type < std::size(kProtections) ? kProtections[type] : "";
  shown["hasPassword"] = !link.password.empty();
  shown["matchAddress"] = link.entry.enableMatchIp;
  shown["upload"] = link.entry.allowUpload;
  shown["created"] = Json::Int64{link.created};
  shown["expires"] = Json::Int64{link.expires};
  shown["maxUses"] = Json::Int64{link.maxUses};
  shown["uses"] = Json::Int64{link.uses};
  shown["maxBytes"] = Json::Int64{link.maxBytes};
  return shown;
}

}  // namespace QELO::Platform
