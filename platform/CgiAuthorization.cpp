#include <cstdlib>
#include <string>

#include "platform/AccountDatabase.h"
#include "platform/CgiContext.h"
#include "platform/PlatformPaths.h"
#include "platform/RemoteAddress.h"
#include "platform/SessionStore.h"
#include "platform/Settings.h"
#include "platform/TextBuffer.h"
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

/// @return 0 when the session exists and so does its user
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
  Account account;
  switch (findAccount(session.user, account)) {
    case Lookup::kFound:
      return 0;
    case Lookup::kAbsent:
      return kNoSuchSession;
    default:
      return kRefused;
  }
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

/// @return whether the session has this option
bool sessionOption(const std::string& name, const std::string& id, const Session& session,
                   std::string& value) {
  if (name == "timeout") {
    value = std::to_string(Settings().SessionTimeout());
  } else if (name == "istimeout") {
    value = session.SecondsLeft(Settings().SessionTimeout()) < 0 ? "1" : "0";
  } else if (name == "skipcheckip") {
    value = session.skipCheckIp ? "1" : "0";
  } else if (name == "sessfile") {
    value = std::string(Paths::kSessionDir) + "/" + id;
  } else if (name == "app") {
    value = session.application;
  } else if (name == "webapi") {
    value = session.webApi;
  }
  return !value.empty();
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
  if (timedOut && allowTimeout == 0) {
    return kTimedOut;
  }
  if (flags->sessionFromParameter == 0 && settings.TokenEnabled() && !hasToken(session)) {
    return kBadToken;
  }
  if (timedOut) {
    return kAuthorizedTimedOut;  // not counted as a use, which would revive the session
  }
  return session.Refresh() ? kAuthorized : kBrokenRecord;
}

int QeloCgiGetOption(QeloCgiContext* context, const char* name, char* value, int size) {
  fillBuffer("", value, size);
  if (context == nullptr) {
    return 0;
  }
  const ContextArea area = loadArea(*context);
  const std::string id(area.id, strnlen(area.id, sizeof area.id));
  Session session;
  std::string text;
  const bool found = SessionStore().Read(id, session) == SessionStore::Result::kGood &&
                     sessionOption(name, id, session, text) && fillBuffer(text, value, size);
  return found ? 1 : 0;
}

}  // extern "C"
