#pragma once

#include <string>

#include "webapi/Export.h"

namespace QELO {

class APIRequest;

/// Login sessions, for the API that logs people in and out. Needs the rights of the account that
/// owns the session store.
class WEBAPI_API LoginSession {
 public:
  enum Result {
    LOGIN_OK,
    LOGIN_WRONG,      ///< no such account, one that may not log in, or the password is wrong
    LOGIN_TOO_MANY,   ///< refused without looking; see retryAfter
    LOGIN_FAILED,     ///< the account database or the session store cannot be used
    LOGIN_NOT_POST,   ///< refused without looking: a password in an address ends in logs
    LOGIN_OTHER_SITE  ///< likewise: the page that a browser sent it for is another site's
  };

  struct Ticket {
    std::string id;      ///< session id, a secret: for the cookie "id" or the parameter "_sid"
    std::string token;   ///< anti-forgery token, for the header "X-Qelo-Token"
    std::string user;    ///< the account's own spelling
    int retryAfter = 0;  ///< seconds until the next attempt is looked at
  };

  /// Checks the password and creates a session bound to the request's remote address. Failed
  /// attempts are counted per address and account and per address; beyond the limit they are
  /// rejected at once. Each attempt is one line to the authorisation facility, with the client's
  /// address and the reason (docs/platform.md).
  static Result Login(const APIRequest& request, const std::string& account,
                      const std::string& password, Ticket& ticket);
  /// Ends a session. @return false when there is none
  static bool Logout(const std::string& id);
  /// Seconds until the session times out when not used again; negative when it has, or is gone.
  static long SecondsLeft(const std::string& id);
};

}  // namespace QELO
