// The fake platform's sharing links, and what is asked beside them.

#include "tests/support/FakeSharing.h"

#include <cstdlib>
#include <cstring>

#include "tests/support/FakePlatform.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Sharing.h"

namespace {

FakePlatform& fake() {
  return FakePlatform::Get();
}

void note(const std::string& call) {
  fake().calls.push_back(call);
}

std::string textOf(const char* text) {
  return text != nullptr ? text : "(null)";
}

}  // namespace

FakeSharing& FakeSharing::Get() {
  static FakeSharing instance;
  return instance;
}

namespace QELO::sharing {

bool GetSharingURL(const std::string& host, int port, bool isHttps, const std::string& path,
                   const std::string& rewriteApp, std::string& url, _tag_SHARING_URL_TYPE& type) {
  note("GetSharingURL(" + host + ", " + std::to_string(port) + ", " + (isHttps ? "https" : "http") +
       ", " + path + ", " + rewriteApp + ")");
  url = fake().sharingUrlKnown ? "sharing:" + host + path + rewriteApp : "";
  type = rewriteApp.empty() ? SHARING_URL_HOST : SHARING_URL_REWRITE;
  return fake().sharingUrlKnown;
}

namespace db {

SharingDB& SharingDB::Instance() {
  static SharingDB instance;
  return instance;
}

bool SharingDB::IsGood() const {
  return fake().sharingGood;
}

EntryDB::EntryDB(SharingDB&) {}
SessionDB::SessionDB(SharingDB&) {}
TokenDB::TokenDB(SharingDB&) {}

bool EntryDB::GetByHash(const std::string& hash, record::Entry& entry) {
  note("EntryDB::GetByHash(" + hash + ")");
  entry = fake().sharingEntry.value_or(entry);
  return fake().sharingEntry.has_value();
}

bool SessionDB::GetBySessionId(const std::string& id, record::Session& session) {
  note("SessionDB::GetBySessionId(" + id + ")");
  session = fake().sharingSession.value_or(session);
  return fake().sharingSession.has_value();
}

bool TokenDB::GetBySessionEntry(const record::Session&, const record::Entry&, record::Token&) {
  note("TokenDB::GetBySessionEntry()");
  return false;
}

}  // namespace db

namespace {

LinkResult done(const std::string& call, Json::Value& answer) {
  note(call);
  answer = FakeSharing::Get().answer;
  return FakeSharing::Get().result;
}

}  // namespace

LinkResult CreateLink(const std::string& owner, const Json::Value& terms, Json::Value& link) {
  return done("CreateLink(" + owner + ", " + JsonHelper::toString(terms) + ")", link);
}

LinkResult ListLinks(const std::string& owner, Json::Value& links) {
  return done("ListLinks(" + owner + ")", links);
}

LinkResult ChangeLink(const std::string& owner, int64_t id, const Json::Value& terms,
                      Json::Value& link) {
  return done(
      "ChangeLink(" + owner + ", " + std::to_string(id) + ", " + JsonHelper::toString(terms) + ")",
      link);
}

LinkResult RemoveLink(const std::string& owner, int64_t id) {
  Json::Value nothing;
  return done("RemoveLink(" + owner + ", " + std::to_string(id) + ")", nothing);
}

LinkResult FindLink(const std::string& owner, const std::string& id, Json::Value& link) {
  return done("FindLink(" + owner + ", " + id + ")", link);
}

LinkResult OpenLink(const std::string& id, const std::string& password, const std::string& address,
                    Json::Value& visit) {
  return done("OpenLink(" + id + ", " + password + ", " + address + ")", visit);
}

}  // namespace QELO::sharing

extern "C" {

int QeloSharingIsAuthorized(const char* sharingId, const char* sharingSid,
                            const QeloSharingVisit* visit) {
  note("QeloSharingIsAuthorized(" + textOf(sharingId) + ", " + textOf(sharingSid) + ", " +
       visit->address + ", " + std::to_string(visit->bodySize) + ")");
  return fake().sharingAuthorized;
}

int QELOUserGetByUID(uid_t uid, QeloUser** user) {
  note("QELOUserGetByUID(" + std::to_string(uid) + ")");
  const auto found = fake().users.find(uid);
  *user =
      found == fake().users.end() ? nullptr : new QeloUser{strdup(found->second.c_str()), uid, uid};
  return *user == nullptr ? -1 : 0;
}

void QELOUserFree(QeloUser* user) {
  note("QELOUserFree()");
  free(user->name);
  delete user;
}

}  // extern "C"
