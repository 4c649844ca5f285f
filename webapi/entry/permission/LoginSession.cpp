#include "webapi/LoginSession.h"

#include <algorithm>

#include "webapi/APIRequest.h"
#include "webapi/entry/permission/UserClass.h"
#include "webapi/platform/Session.h"

namespace QELO {
namespace {

constexpr size_t kMaxAccountBytes = 256;

/// Whether an account can have this name: not too long, and nothing that logs or files choke on.
bool isAccountName(const std::string& account) {
  return account.size() <= kMaxAccountBytes &&
         std::none_of(account.begin(), account.end(),
                      [](unsigned char c) { return c < 0x20 || c == 0x7F; });
}

}  // namespace

LoginSession::Result LoginSession::Login(const APIRequest& request, const std::string& account,
                                         const std::string& password, Ticket& ticket) {
  ticket = Ticket();
  if (account.empty() || password.empty()) {
    return LOGIN_WRONG;
  }
  const std::string address = request.GetRemoteIP();
  // Counted under a bounded name, however long the one that was sent.
  const std::string counted = account.substr(0, kMaxAccountBytes);
  const int wait = QeloLoginAttempt(address.c_str(), counted.c_str());
  if (wait != 0) {
    ticket.retryAfter = std::max(wait, 0);
    return wait > 0 ? LOGIN_TOO_MANY : LOGIN_FAILED;
  }
  if (!isAccountName(account) || password.find('\0') != std::string::npos) {
    return LOGIN_WRONG;
  }
  char user[kUserNameSize] = {};
  const int check = QeloLoginPasswordCheck(account.c_str(), password.c_str(), user, kUserNameSize);
  if (check != 1) {
    return check == 0 ? LOGIN_WRONG : LOGIN_FAILED;
  }
  char id[QELO_SESSION_ID_LENGTH + 1] = {};
  char token[QELO_SESSION_ID_LENGTH + 1] = {};
  if (QeloSessionCreate(user, address.c_str(), id, token) != 0) {
    return LOGIN_FAILED;
  }
  QeloLoginSucceeded(address.c_str(), counted.c_str());
  ticket.id = id;
  ticket.token = token;
  ticket.user = user;
  return LOGIN_OK;
}

bool LoginSession::Logout(const std::string& id) {
  return !id.empty() && QeloSessionRemove(id.c_str()) == 0;
}

long LoginSession::SecondsLeft(const std::string& id) {
  return id.empty() ? -1 : QeloSessionSecondsLeft(id.c_str());
}

}  // namespace QELO
