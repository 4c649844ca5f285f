#include "webapi/model/request/APIRequestPrivate.h"

#include <strings.h>

#include <cstdint>
#include <cstdlib>
#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/json/Literal.h"
#include "webapi/platform/Cgi.h"

namespace QELO {
namespace {

constexpr unsigned int kNoUser = 0xFFFFFFFF;

struct UserClass {
  const char* name;
  int bit;
};
constexpr UserClass kUserClasses[] = {
    {"admin.local", 0x01},  {"admin.domain", 0x02},  {"admin.ldap", 0x04},
    {"normal.local", 0x08}, {"normal.domain", 0x10}, {"normal.ldap", 0x20},
};

int userClassBit(const std::string& name) {
  for (const UserClass& entry : kUserClasses) {
    if (name == entry.name) {
      return entry.bit;
    }
  }
  return 0;
}

}  // namespace

APIRequestPrivate::APIRequestPrivate(APIRequest* owner) : owner_(owner) {
  for (const char* section :
       {"environ", "cookie", "reqLib", "session", "param", "attr", "url", "userAgent", "private"}) {
    AddSection(section);
  }
  Put("private", "requestMethod", Json::Int64{APIRequest::METHOD_UNKNOWN});
}

void APIRequestPrivate::InitEnv(Json::Value env) {
  TakeData("environ", std::move(env), true);
  InitCookie();
  InitRequestMethod();
  InitSharing();
}

void APIRequestPrivate::InitParam(Json::Value params, bool replace) {
  if (replace) {
    ClearData("param", "");
    sent_.Forget();
  }
  for (const char* source : {"getParam", "postParam"}) {
    if (JsonHelper::hasMember(params, source)) {
      Json::Value& section = params[Literal(source)];
      DecryptParam(section);
      SetAPIDesc(section);
      TakeData("param", std::move(section), false);
    }
  }
}

void APIRequestPrivate::InitAPIInfo(const Json::Value& description) {
  ReplaceData("reqLib", Json::Value(description));
}

void APIRequestPrivate::InitSession(Json::Value session) {
  ReplaceData("session", std::move(session));
}

void APIRequestPrivate::Restore(Json::Value& record) {
  Deserialize(record);
  sent_.Forget();
  InitSharing();
}

void APIRequestPrivate::SetAPIDesc(const Json::Value& params) {
  for (const char* key : {"api", "method"}) {
    if (const Json::Value* text = JsonHelper::find(params, key)) {
      Put("private", key, JsonHelper::asString(*text));
    }
  }
  if (const Json::Value* version = JsonHelper::find(params, "version")) {
    Put("private", "version", Json::Int64{JsonHelper::asInt(*version)});
  }
}

void APIRequestPrivate::InitSharing() {
  sharingId_ = Text("environ", SZ_X_SHARING_HEADER);
  sharingSid_ = Text("cookie", sharing::SZK_SHARING_SID);
  if (sharingId_.empty()) {
    return;
  }
  sharing::db::SharingDB& database = sharing::db::SharingDB::Instance();
  sharing::db::EntryDB entries(database);
  sharing::db::SessionDB sessions(database);
  sharing::db::TokenDB tokens(database);
  if (database.IsGood()) {
    entries.GetByHash(sharingId_, sharingEntry_);
    sessions.GetBySessionId(sharingSid_, sharingSession_);
    tokens.GetBySessionEntry(sharingSession_, sharingEntry_, sharingToken_);
  }
}

unsigned int APIRequestPrivate::GetLoginUID() {
  if (HasData("session", "uid")) {
    const uint64_t uid = JsonHelper::asUInt64(GetData("session", "uid", kNoUser), kNoUser);
    return uid < kNoUser ? static_cast<unsigned int>(uid) : kNoUser;
  }
  const std::string user = Text("session", "username");
  if (user.empty()) {
    return kNoUser;
  }
  const unsigned int uid = QeloCgiUIDGet(Text("cookie", "id").c_str(), user.c_str());
  SetData("session", "uid", uid, false);
  return uid;
}

int APIRequestPrivate::GetAllowUser() {
  const int known = Number("session", "allowUser", 0);
  if (known != 0) {
    return known;
  }
  const Json::Value none(Json::arrayValue);
  const Json::Value& classes = GetData("reqLib", "allowUser", none);
  if (!classes.isArray() || classes.empty()) {
    return 0;
  }
  int bits = 0;
  for (const Json::Value& entry : classes) {
    bits |= entry.isString() ? userClassBit(entry.asString()) : 0;
  }
  SetData("session", "allowUser", bits, false);
  return bits;
}

bool APIRequestPrivate::HasAppPriv(const std::string& name) const {
  return GetData("session", "appPriv", "") == Json::Value(name);
}

const char* APIRequestPrivate::GetQeloAccessTokenID() const {
  const std::string token = Text("environ", "qeloAccessToken");
  if (token.empty()) {
    return nullptr;
  }
  setenv("qeloAccessToken", token.c_str(), 1);
  return getenv("qeloAccessToken");
}

bool APIRequestPrivate::IsPollingTask() const {
  return Find("environ", "task_id") != nullptr && Find("environ", "task_user") != nullptr;
}

bool APIRequestPrivate::IsUploadRequest() const {
  return Text("environ", "CONTENT_TYPE").find("multipart/form-data") != std::string::npos ||
         IsSliceUploadRequest();
}

bool APIRequestPrivate::IsSliceUploadRequest() const {
  const std::string type = Text("environ", "HTTP_X_TYPE_NAME");
  return !type.empty() && strcasecmp(type.c_str(), "SLICEUPLOAD") == 0;
}

std::string APIRequestPrivate::GetCookie(const std::string& name, const std::string& def) const {
  return Text("cookie", name, def);
}

std::string APIRequestPrivate::Text(std::string_view section, std::string_view key,
                                    const std::string& def) const {
  const Json::Value* found = Find(section, key);
  return found != nullptr ? JsonHelper::asString(*found, def) : def;
}

int APIRequestPrivate::Number(std::string_view section, std::string_view key, int def) const {
  const Json::Value* found = Find(section, key);
  return found != nullptr ? JsonHelper::asInt(*found, def) : def;
}

bool APIRequestPrivate::Flag(std::string_view section, std::string_view key, bool missing,
                             bool unreadable) const {
  const Json::Value* found = Find(section, key);
  return found != nullptr ? JsonHelper::asBool(*found, unreadable) : missing;
}

}  // namespace QELO
