#include <json/json.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <optional>
#include <string>

#include "platform/accounts/Accounts.h"
#include "platform/base/IpAddress.h"
#include "platform/base/Paths.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/base/OwnFile.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "AppPrivileges.cpp";

/// Who asks, from where.
struct Caller {
  Account account;
  std::vector<gid_t> groups;
  std::optional<IpAddress> address;  ///< none: not known
};

/// Whether a rule meets the caller. What cannot be told, as with a rule that is malformed, allows
/// nothing and denies everything.
enum class Match { kNo, kYes, kUnknown };

Match matchGroup(const std::string& name, const Caller& caller) {
  gid_t gid = 0;
  const Lookup lookup = findGroup(name, gid);
  if (lookup == Lookup::kFailed) {
    return Match::kUnknown;
  }
  const bool isMember =
      lookup == Lookup::kFound &&
      std::find(caller.groups.begin(), caller.groups.end(), gid) != caller.groups.end();
  return isMember ? Match::kYes : Match::kNo;
}

Match matchAddress(const std::string& network, const Caller& caller) {
  bool valid = false;
  const bool inside = caller.address.value_or(IpAddress()).IsIn(network, valid);
  if (!valid || !caller.address) {
    return Match::kUnknown;
  }
  return inside ? Match::kYes : Match::kNo;
}

Match matchKey(const std::string& key, const Json::Value& value, const Caller& caller) {
  if (key == "everyone" && value.isBool()) {
    return value.asBool() ? Match::kYes : Match::kNo;
  }
  if (!value.isString()) {
    return Match::kUnknown;
  }
  const std::string text = JsonHelper::asString(value);
  if (key == "user") {
    return text == caller.account.name ? Match::kYes : Match::kNo;
  }
  if (key == "group") {
    return matchGroup(text, caller);
  }
  return key == "address" ? matchAddress(text, caller) : Match::kUnknown;
}

Match matchRule(const Json::Value& rule, const Caller& caller) {
  if (!rule.isObject() || rule.empty()) {
    return Match::kUnknown;
  }
  Match whole = Match::kYes;
  for (const std::string& key : rule.getMemberNames()) {
    const Match one = matchKey(key, rule[key], caller);
    if (one == Match::kNo) {
      return Match::kNo;
    }
    whole = one == Match::kUnknown ? Match::kUnknown : whole;
  }
  return whole;
}

/// @param unknown  what a rule counts for when it cannot be told whether it meets the caller
bool anyRuleMeets(const Json::Value& rules, const Caller& caller, bool unknown) {
  if (!rules.isArray()) {
    return !rules.isNull() && unknown;
  }
  return std::any_of(rules.begin(), rules.end(), [&](const Json::Value& rule) {
    const Match match = matchRule(rule, caller);
    return match == Match::kYes || (match == Match::kUnknown && unknown);
  });
}

/// Whether this is null, or an object of "allow" and "deny" alone: a misspelt "deny" may not pass.
bool areRules(const Json::Value& rules) {
  if (!rules.isObject()) {
    return rules.isNull();
  }
  const std::vector<std::string> names = rules.getMemberNames();
  return std::all_of(names.begin(), names.end(),
                     [](const std::string& name) { return name == "allow" || name == "deny"; });
}

/// The rules of an application: null when there are none.
/// @return false, with the reason logged, when the file is there and cannot be understood, or
/// others
///         may write it
bool readRules(const std::string& application, Json::Value& rules) {
  Json::Value file;
  struct stat info {};
  rules = Json::Value();
  if (stat(Paths::kAppPrivileges, &info) != 0 && errno == ENOENT) {
    return true;
  }
  if (OthersMayChange(Paths::kAppPrivileges)) {
    WEBAPI_LOG(kSource, "refused to read %s: others may write it or its directory",
               Paths::kAppPrivileges);
    return false;
  }
  const bool readable = JsonHelper::fromFile(Paths::kAppPrivileges, file) && file.isObject();
  if (readable) {
    rules = JsonHelper::member(file, application);
  }
  if (!readable || !areRules(rules)) {
    WEBAPI_LOG(kSource, "%s: no rules can be read for %s", Paths::kAppPrivileges,
               LogText(application).c_str());
    return false;
  }
  return true;
}

bool findCaller(const char* user, const char* address, Caller& caller) {
  IpAddress parsed;
  if (address != nullptr && IpAddress::Parse(address, parsed)) {
    caller.address = parsed;
  }
  return findAccount(user, caller.account) == Lookup::kFound &&
         findGroupsOf(caller.account, caller.groups) == Lookup::kFound;
}

}  // namespace
}  // namespace QELO::Platform

extern "C" int QLIBAppPrivUserHas(const char* user, const char* application, const char* address) {
  using namespace QELO::Platform;
  Caller caller;
  Json::Value rules;
  if (!findCaller(user, address, caller) || !readRules(application, rules) ||
      anyRuleMeets(QELO::JsonHelper::member(rules, "deny"), caller, true)) {
    return 0;
  }
  return isAdministrator(Settings(), caller.account) == 1 ||
                 anyRuleMeets(QELO::JsonHelper::member(rules, "allow"), caller, false)
             ? 1
             : 0;
}
