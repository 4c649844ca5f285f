#include <cstdlib>
#include <string>

#include "platform/accounts/Accounts.h"
#include "platform/base/Paths.h"
#include "platform/base/TextBuffer.h"
#include "platform/cgi/Context.h"
#include "platform/cgi/RemoteAddress.h"
#include "platform/login/SessionStore.h"
#include "platform/settings/Settings.h"
#include "webapi/platform/Cgi.h"

namespace QELO::Platform {
namespace {

/// Results of QeloCgiIsAuthorizedEx.
enum Authorization : int {
  kOtherAddress = -8,
  kBadToken = -7,
  kRefused = -6,
  kNoSuchSession = -5,
  kMalformed = -4,
  kBrokenRecord = -3,
  kNoId = -2,
  kTimedOut = -1,
  kAuthorized = 1,
  kAuthorizedTimedOut = 2
};

/// Whether the session's user is there and may still use it. @return 0, or the refusal
int checkUser(const Session& session) {
  Account account;
  const Lookup lookup = findAccount(session.user, account);
  if (lookup == Lookup::kFailed) {
    return kRefused;
  }
  if (lookup == Lookup::kAbsent || account.uid != session.uid) {
    return kNoSuchSession;
  }
  return usabilityOf(account) == Usability::kGood ? 0 : kRefused;
}

/// @return 0 when the session exists and its user may use it
int findSession(const ContextArea& area, Session& session) {
  if (area.state == ContextArea::kNoId) {
    return kNoId;
  }
  if (area.state != ContextArea::kHasId) {
    return kMalformed;
  }
  switch (SessionStore().Read(std::string(area.id, kSecretLength), session)) {
    case SessionStore::Result::kGood:
      break;
    case SessionStore::Result::kMalformed:
      return kMalformed;
    case SessionStore::Result::kBroken:
      return kBrokenRecord;
    default:
      return kNoSuchSession;
  }
  return checkUser(session);
}

bool isFromItsAddress(const Session& session, const Settings& settings) {
  IpAddress bound;
  IpAddress client;
  return session.skipCheckIp || (IpAddress::Parse(session.address, bound) &&
                                 findRemoteAddress(settings, client) && bound == client);
}

bool hasToken(const Session& session) {
  const char* token = getenv("HTTP_X_QELO_TOKEN");
  return token != nullptr && equalSecrets(token, session.token);
}

/// Keeps in the context what callers ask next, so that the record is read once.
void remember(const Session& session, bool timedOut, QeloCgiContext& context) {
  ContextArea area = loadArea(context);
  area.known = 1;
  area.timedOut = timedOut ? 1 : 0;
  area.skipCheckIp = session.skipCheckIp ? 1 : 0;
  area.hasMore = session.application.empty() && session.webApi.empty() ? 0 : 1;
  storeArea(area, context);
}

/// Reads the flags of a context whose session was not checked yet.
bool learn(const std::string& id, QeloCgiContext& context) {
  Session session;
  if (SessionStore().Read(id, session) != SessionStore::Result::kGood) {
    return false;
  }
  remember(session, session.SecondsLeft(Settings().SessionTimeout()) < 0, context);
  return true;
}

std::string storedOption(const std::string& name, const std::string& id) {
  Session session;
  if (SessionStore().Read(id, session) != SessionStore::Result::kGood) {
    return "";
  }
  return name == "app" ? session.application : session.webApi;
}

/// An option of the session; "" when it has no such option.
std::string sessionOption(const std::string& name, const std::string& id, const ContextArea& area) {
  if (name == "timeout") {
    return std::to_string(Settings().SessionTimeout());
  }
  if (name == "istimeout") {
    return area.timedOut != 0 ? "1" : "0";
  }
  if (name == "skipcheckip") {
    return area.skipCheckIp != 0 ? "1" : "0";
  }
  if (name == "sessfile") {
    return std::string(Paths::kSessionDir) + "/" + id;
  }
  const bool isStored = name == "app" || name == "webapi";
  return isStored && area.hasMore != 0 ? storedOption(name, id) : "";
}

}  // namespace
}  // namespace QELO::Platform

using namespace QELO::Platform;

extern "C" {

int QeloCgiIsAuthorizedEx(QeloCgiContext* context, const QeloCgiAuthFlags* flags, char* user,
                          int size, int allowTimeout, int checkAddress) {
  if (!fillBuffer("", user, size) || context == nullptr || flags == nullptr) {
    return kRefused;
  }
  Session session;
  const int found = findSession(loadArea(*context), session);
  if (found != 0) {
    return found;
  }
  if (!fillBuffer(session.user, user, size)) {
    return kRefused;
  }
  const Settings settings;
  if (checkAddress != 0 && !isFromItsAddress(session, settings)) {
    return kOtherAddress;
  }
  const bool timedOut = session.SecondsLeft(settings.SessionTimeout()) < 0;
  remember(session, timedOut, *context);
  if (timedOut && allowTimeout == 0) {
    return kTimedOut;
  }
  if (flags->sessionFromParameter == 0 && settings.TokenEnabled() && !hasToken(session)) {
    return kBadToken;
  }
  if (timedOut) {
    return kAuthorizedTimedOut;  // not counted as a use, which would revive the session
  }
  return flags->keepIdle != 0 || session.Refresh() ? kAuthorized : kBrokenRecord;
}

int QeloCgiGetOption(QeloCgiContext* context, const char* name, char* value, int size) {
  fillBuffer("", value, size);
  if (context == nullptr) {
    return 0;
  }
  ContextArea area = loadArea(*context);
  const std::string id(area.id, strnlen(area.id, sizeof area.id));
  if (area.known == 0 && !learn(id, *context)) {
    return 0;
  }
  area = loadArea(*context);
  const std::string text = sessionOption(name, id, area);
  return !text.empty() && fillBuffer(text, value, size) ? 1 : 0;
}

}  // extern "C"
