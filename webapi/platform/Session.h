#pragma once

#include "webapi/Export.h"

/// The host's login service.
extern "C" {

/// Counts one login attempt before it is looked at.
/// @return 0 when it may go on, else the seconds until the next one may; -1 when the count cannot
///         be kept, and then no attempt may go on
WEBAPI_API int QeloLoginAttempt(const char* address, const char* account);
/// Forgets the failed attempts of an account from an address.
WEBAPI_API void QeloLoginSucceeded(const char* address, const char* account);
/// Answers of QeloLoginPasswordCheck.
enum {
  QELO_PASSWORD_UNCHECKED = -1,
  QELO_PASSWORD_WRONG = 0,  ///< or there is no such account
  QELO_PASSWORD_RIGHT = 1,
  QELO_PASSWORD_BARRED = 2  ///< right, but the account is locked, expired or not for logins
};
/// Checks a password; takes as long for an unknown account as for a wrong password.
/// @param address  the client's, for the host's own records; "" when it is not known
/// @param user     receives the account's own spelling when the password is right, else ""
WEBAPI_API int QeloLoginPasswordCheck(const char* account, const char* password,
                                      const char* address, char* user, int size);

/// Length of a session id and of a token, without the NUL.
enum { QELO_SESSION_ID_LENGTH = 43 };

/// Creates a session bound to an address.
/// @param id, token  receive QELO_SESSION_ID_LENGTH characters and a NUL each
/// @return 0 on success
WEBAPI_API int QeloSessionCreate(const char* user, const char* address, char* id, char* token);
/// @return 0 on success, -1 when there is no such session
WEBAPI_API int QeloSessionRemove(const char* id);
/// Counts now as the session's last use. @return 0 on success
WEBAPI_API int QeloSessionRefresh(const char* id);
/// Seconds until the idle time-out; negative when past it, or there is no such session.
WEBAPI_API long QeloSessionSecondsLeft(const char* id);

}  // extern "C"
