#include "webapi/LoginSession.h"

#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "webapi/APIRequest.h"
#include "webapi/base/Log.h"
#include "webapi/entry/permission/LoginOrigin.h"
#include "webapi/entry/permission/UserClass.h"
#include "webapi/platform/Session.h"

namespace QELO {
namespace {

constexpr char kSource[] = "LoginSession.cpp";
constexpr size_t kMaxAccountBytes = 256;

/// Whether an account can have this name: not too long, and nothing that logs or files choke on.
bool isAccountName(const std::string& account) {
  return account.size() <= kMaxAccountBytes &&
         std::none_of(account.begin(), account.end(),
                      [](unsigned char c) { return c < 0x20 || c == 0x7F; });
}

struct Outcome {
  LoginSession::Result result;
  std::string reason;
};

/// One line in the form that packaging/fail2ban reads. What the client chose stands last.
void tell(const Outcome& outcome, const std::string& client, const std::string& account) {
  const std::string address = client.empty() ? "unknown" : client;
  const std::string& reason = outcome.reason;
  switch (outcome.result) {
    case LoginSession::LOGIN_OK:
      syslog(LOG_AUTH | LOG_INFO, "%s:%d login accepted from %s: %s; account [%s]", kSource,
             __LINE__, LogText(address).c_str(), LogText(reason).c_str(), LogText(account).c_str());
      return;
    case LoginSession::LOGIN_WRONG:
      syslog(LOG_AUTH | LOG_NOTICE, "%s:%d login failed from %s: %s; account [%s]", kSource,
             __LINE__, LogText(address).c_str(), LogText(reason).c_str(), LogText(account).c_str());
      return;
    case LoginSession::LOGIN_FAILED:
      syslog(LOG_AUTH | LOG_ERR, "%s:%d login not possible from %s: %s; account [%s]", kSource,
             __LINE__, LogText(address).c_str(), LogText(reason).c_str(), LogText(account).c_str());
      return;
    default:
      syslog(LOG_AUTH | LOG_NOTICE, "%s:%d login refused from %s: %s; account [%s]", kSource,
             __LINE__, LogText(address).c_str(), LogText(reason).c_str(), LogText(account).c_str());
  }
}

/// What speaks against the attempt before its password is looked at; counts it.
Outcome refusalOf(const APIRequest& request, const std::string& address, const std::string& account,
                  LoginSession::Ticket& ticket) {
  if (!isPost(request)) {
    return {LoginSession::LOGIN_NOT_POST, "not sent by POST"};
  }
  if (comesFromAnotherSite(request)) {
    return {LoginSession::LOGIN_OTHER_SITE, "sent for another site's page"};
  }
  const int wait = QeloLoginAttempt(address.c_str(), account.c_str());
  ticket.retryAfter = std::max(wait, 0);
  if (wait > 0) {
    return {LoginSession::LOGIN_TOO_MANY,
            "too many attempts, " + std::to_string(wait) + " seconds left"};
  }
  return wait == 0 ? Outcome{LoginSession::LOGIN_OK, ""}
                   : Outcome{LoginSession::LOGIN_FAILED, "attempts cannot be counted"};
}

/// @param ticket  receives the new session
Outcome tryPassword(const std::string& address, const std::string& account,
                    const std::string& password, LoginSession::Ticket& ticket) {
  const Outcome wrong{LoginSession::LOGIN_WRONG, "wrong account or password"};
  if (!isAccountName(account) || password.find('\0') != std::string::npos) {
    return wrong;
  }
  char user[kUserNameSize] = {};
  switch (QeloLoginPasswordCheck(account.c_str(), password.c_str(), address.c_str(), user,
                                 kUserNameSize)) {
    case QELO_PASSWORD_RIGHT:
      break;
    case QELO_PASSWORD_WRONG:
      return wrong;
    case QELO_PASSWORD_BARRED:
      return {LoginSession::LOGIN_WRONG, "the account is locked, expired or not for logins"};
    default:
      return {LoginSession::LOGIN_FAILED, "passwords cannot be checked"};
  }
  char id[QELO_SESSION_ID_LENGTH + 1] = {};
  char token[QELO_SESSION_ID_LENGTH + 1] = {};
  if (QeloSessionCreate(user, address.c_str(), id, token) != 0) {
    return {LoginSession::LOGIN_FAILED, "no session can be made"};
  }
  ticket.id = id;
  ticket.token = token;
  ticket.user = user;
  return {LoginSession::LOGIN_OK, "password"};
}

}  // namespace

LoginSession::Result LoginSession::Login(const APIRequest& request, const std::string& account,
                                         const std::string& password, Ticket& ticket) {
  ticket = Ticket();
  if (account.empty() || password.empty()) {
    return LOGIN_WRONG;
  }
  const std::string address = request.GetRemoteIP();
  // Counted and logged under a bounded name, however long the one that was sent.
  const std::string counted = account.substr(0, kMaxAccountBytes);
  Outcome outcome = refusalOf(request, address, counted, ticket);
  if (outcome.result == LOGIN_OK) {
    outcome = tryPassword(address, account, password, ticket);
  }
  if (outcome.result == LOGIN_OK) {
    QeloLoginSucceeded(address.c_str(), counted.c_str());
  }
  tell(outcome, address, counted);
  return outcome.result;
}

bool LoginSession::Logout(const std::string& id) {
  return !id.empty() && QeloSessionRemove(id.c_str()) == 0;
}

long LoginSession::SecondsLeft(const std::string& id) {
  return id.empty() ? -1 : QeloSessionSecondsLeft(id.c_str());
}

}  // namespace QELO
