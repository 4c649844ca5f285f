#include "platform/accounts/AccountDatabase.h"
#include "platform/base/IpAddress.h"
#include "platform/base/TextBuffer.h"
#include "platform/login/SessionStore.h"
#include "platform/settings/Settings.h"
#include "platform/tasks/StorePlace.h"
#include "webapi/platform/Session.h"

using namespace QELO::Platform;

namespace {

constexpr int kMostSessions = 1'000'000;
constexpr int kLongestPause = 366 * 86400;  // seconds

}  // namespace

extern "C" {

int QeloSessionCreate(const char* user, const char* address, char* id, char* token) {
  constexpr int kBufferSize = QELO_SESSION_ID_LENGTH + 1;
  fillBuffer("", id, kBufferSize);
  fillBuffer("", token, kBufferSize);
  Account account;
  if (findAccount(user, account) != Lookup::kFound) {
    return -1;
  }
  const Settings settings;
  Session session;
  session.user = account.name;
  session.uid = account.uid;
  session.skipCheckIp = settings.GetSwitch("skip_check_ip", false);
  IpAddress client;
  if (IpAddress::Parse(address, client)) {
    session.address = client.Text();
  } else if (!session.skipCheckIp) {
    return -1;  // nobody could use a session that is bound to no address
  }
  const SessionStore store(true);
  store.Purge(settings.SessionTimeout(),
              settings.GetNumber("session_purge_pause", 600, 0, kLongestPause));
  const int limit = settings.GetNumber("session_limit", 64, 1, kMostSessions);
  std::string newId;
  std::string newToken;
  if (!store.Create(session, static_cast<size_t>(limit), newId, newToken)) {
    return -1;
  }
  reserveTaskStore(account.uid, account.gid);
  fillBuffer(newId, id, kBufferSize);
  fillBuffer(newToken, token, kBufferSize);
  return 0;
}

int QeloSessionRemove(const char* id) {
  return SessionStore().Remove(id) ? 0 : -1;
}

int QeloSessionRefresh(const char* id) {
  Session session;
  if (SessionStore().Read(id, session) != SessionStore::Result::kGood ||
      session.SecondsLeft(Settings().SessionTimeout()) < 0) {
    return -1;  // a session that timed out stays so
  }
  return session.Refresh() ? 0 : -1;
}

long QeloSessionSecondsLeft(const char* id) {
  timespec lastUse{};
  if (SessionStore::ReadLastUse(id, lastUse) != SessionStore::Result::kGood) {
    return -1;
  }
  return secondsLeft(lastUse, Settings().SessionTimeout());
}

}  // extern "C"
