// Access tokens that users make, list and revoke for themselves.

#include <time.h>

#include <algorithm>
#include <string>

#include "platform/base/IpAddress.h"
#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/settings/Settings.h"
#include "platform/tokens/UidOf.h"
#include "platform/tokens/module/TokenModule.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/base/Text.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Token.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "UserTokens.cpp";
constexpr size_t kLongestName = 64;      // bytes
constexpr size_t kLongestPattern = 128;  // bytes
constexpr unsigned kMostScopes = 32;
constexpr int kDefaultDays = 90;
constexpr int kMostDays = 3650;
constexpr int64_t kDaySeconds = 86400;
constexpr mode_t kStateDirMode = 0711;

bool isName(const std::string& text) {
  return !text.empty() && text.size() <= kLongestName &&
         std::none_of(text.begin(), text.end(),
                      [](unsigned char c) { return c < 0x20 || c == 0x7F; });
}

/// A name, its beginning and a "*", or "*".
bool isPattern(const Json::Value& value) {
  const std::string text = value.isString() ? JsonHelper::asString(value) : "";
  const size_t star = text.find('*');
  return !text.empty() && text.size() <= kLongestPattern &&
         (star == std::string::npos || star + 1 == text.size()) &&
         std::all_of(text.begin(), text.end(), [](char c) {
           return IsAlphanumeric(c) || c == '.' || c == '_' || c == '-' || c == '*';
         });
}

bool readScopes(const Json::Value& list, std::vector<TokenStore::Scope>& scopes) {
  if (!list.isArray() || list.empty() || list.size() > kMostScopes) {
    return false;
  }
  for (const Json::Value& scope : list) {
    const Json::Value& api = JsonHelper::member(scope, "api");
    const Json::Value& method = JsonHelper::member(scope, "method");
    if (!isPattern(api) || !(method.isNull() || isPattern(method))) {
      return false;
    }
    scopes.push_back(
        {JsonHelper::asString(api), method.isNull() ? "*" : JsonHelper::asString(method)});
  }
  return true;
}

bool isNetwork(const std::string& text) {
  bool valid = false;
  IpAddress().IsIn(text, valid);
  return text.empty() || valid;
}

bool readTerms(const Json::Value& terms, TokenStore::Entry& entry) {
  const Json::Value& days = JsonHelper::member(terms, "days");
  const Json::Value& readOnly = JsonHelper::member(terms, "readOnly");
  const Json::Value& address = JsonHelper::member(terms, "address");
  const int count = days.isNull() ? kDefaultDays : JsonHelper::asInt(days, 0);
  entry.name = JsonHelper::asString(JsonHelper::member(terms, "name"));
  entry.readOnly = JsonHelper::asBool(readOnly, false);
  entry.address = JsonHelper::asString(address);
  entry.expires = time(nullptr) + count * kDaySeconds;
  return isName(entry.name) && readScopes(JsonHelper::member(terms, "scopes"), entry.scopes) &&
         (readOnly.isNull() || readOnly.isBool()) && (address.isNull() || address.isString()) &&
         isNetwork(entry.address) && count >= 1 && count <= kMostDays;
}

Json::Value recordOf(const TokenStore::Entry& entry) {
  Json::Value record(Json::objectValue);
  record["id"] = static_cast<Json::Int64>(entry.id);
  record["name"] = entry.name;
  record["scopes"] = Json::Value(Json::arrayValue);
  for (const TokenStore::Scope& scope : entry.scopes) {
    Json::Value pair(Json::objectValue);
    pair["api"] = scope.api;
    pair["method"] = scope.method;
    record["scopes"].append(pair);
  }
  record["readOnly"] = entry.readOnly;
  record["address"] = entry.address;
  record["created"] = static_cast<Json::Int64>(entry.created);
  record["expires"] = static_cast<Json::Int64>(entry.expires);
  record["used"] = static_cast<Json::Int64>(entry.used);
  return record;
}

/// @return false when the database cannot be used (logged), or there is no such user
bool manage(const char* user, TokenWork& work) {
  work.entry.owner = {user, uidOf(user), false};
  const auto call = reinterpret_cast<TokenManage>(findInModule(kTokenModule, kTokenManage));
  if (work.entry.owner.uid == TokenStore::kNobody || call == nullptr) {
    return false;
  }
  const bool good = call(Paths::kTokenDatabase, uidOf, work);
  if (!good) {
    WEBAPI_LOG(kSource, "cannot use the access tokens [%s]", LogText(work.error).c_str());
  }
  return good;
}

}  // namespace
}  // namespace QELO::Platform

using namespace QELO::Platform;

int QeloAccessTokenCreate(const char* user, const Json::Value& terms, Json::Value& record,
                          std::string& token) {
  TokenWork work;
  work.kind = TokenWork::kCreate;
  work.most = static_cast<size_t>(Settings().GetNumber("token_limit", 64, 0, 100000));
  if (!readTerms(terms, work.entry)) {
    return QELO_TOKEN_BAD_TERMS;
  }
  QELOFSMkdirP(QELO::Paths::kStateDir, 1, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1),
               kStateDirMode);
  if (!manage(user, work)) {
    return QELO_TOKEN_FAILED;
  }
  if (!work.done) {
    return QELO_TOKEN_TOO_MANY;
  }
  record = recordOf(work.entry);
  token = work.token;
  return QELO_TOKEN_DONE;
}

int QeloAccessTokenList(const char* user, Json::Value& records) {
  TokenWork work;
  work.kind = TokenWork::kList;
  if (!manage(user, work)) {
    return QELO_TOKEN_FAILED;
  }
  records = Json::Value(Json::arrayValue);
  for (const TokenStore::Entry& entry : work.entries) {
    records.append(recordOf(entry));
  }
  return QELO_TOKEN_DONE;
}

int QeloAccessTokenRevoke(const char* user, long long id) {
  TokenWork work;
  work.kind = TokenWork::kRevoke;
  work.entry.id = id;
  if (!manage(user, work)) {
    return QELO_TOKEN_FAILED;
  }
  return work.done ? QELO_TOKEN_DONE : QELO_TOKEN_NONE;
}
