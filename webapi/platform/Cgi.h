#pragma once

#include "webapi/Export.h"

/// The host's CGI library. Operations whose names end in "Ex" or that fill a buffer always end
/// the buffer's text with a NUL.
extern "C" {

/// Working area of one CGI invocation. The first word points to the string hash that upload
/// intake fills; the rest is the CGI library's own. May be copied as bytes.
struct QeloCgiContext {
  unsigned char block[60];
};

/// How the session came to us.
struct QeloCgiAuthFlags {
  unsigned int sessionFromParameter;  ///< 1: the session id was a parameter, which another site
                                      ///< cannot know: no anti-forgery token is asked for
  unsigned int keepIdle;              ///< 1: the check does not count as use of the session
};

/// Starts the context. @return 1 on success
WEBAPI_API int QeloCgiInit(const char* program, QeloCgiContext* context);
/// As QeloCgiInit for a named user store, with its cookies taken as by QeloCgiLoadInCookies.
/// @return 1 on success, 0 when there is no such store; login sessions are in "current.users"
WEBAPI_API int QeloCgiInitEx(const char* userStore, QeloCgiContext* context);
/// Takes the cookies from the process environment's HTTP_COOKIE; of two "id" the last counts.
WEBAPI_API int QeloCgiLoadInCookies(QeloCgiContext* context);
/// The user interface's language, three letters, never null. The text is static.
WEBAPI_API const char* QeloCgiGetLang(QeloCgiContext* context);
/// 1 when sessions that come by cookie need the anti-forgery token, else 0.
WEBAPI_API int QeloCgiIsTokenEnable(QeloCgiContext* context);
/// Whether the host's settings let a CGI program keep this variable of its environment, beyond
/// those that it needs. @return 1 yes, 0 no
WEBAPI_API int QeloCgiKeepsVariable(const char* name);
/// The client's address. @return 0 on success
WEBAPI_API int QeloCgiGetRemoteIP(char* address, int size);
/// Checks the login session of the context's cookie "id" and counts the use, unless it is to be
/// kept idle.
/// @param user          receives the login name, "" when there is no session
/// @param allowTimeout  non-zero: a session past its idle time-out is accepted
/// @param checkAddress  non-zero: the session's address binding is checked
/// @return -8 another address; -7 anti-forgery token missing or wrong; -6 refused; -5 no such
///         session; -4 malformed id; -3 its record is broken; -2 no id; -1 timed out;
///         1 authorised; 2 authorised, timed out
WEBAPI_API int QeloCgiIsAuthorizedEx(QeloCgiContext* context, const QeloCgiAuthFlags* flags,
                                     char* user, int size, int allowTimeout, int checkAddress);
/// An option of the context's session: "timeout" (idle limit, seconds), "istimeout" ("1" when
/// past it), "skipcheckip" ("1" when not bound to an address), "sessfile", "app", "webapi".
/// @return 1 when found; else 0 and an empty text
WEBAPI_API int QeloCgiGetOption(QeloCgiContext* context, const char* name, char* value, int size);
/// The user id of a session's user, 0xFFFFFFFF when there is no such user.
WEBAPI_API unsigned int QeloCgiUIDGet(const char* sessionId, const char* user);

/// Deciphers a parameter line in place when it is enciphered. @return 0 on failure
WEBAPI_API int QeloCgiDetectAndDecryptParamLine(char* line);
/// The public key that envelopes for this host are made for, as PEM.
/// @param size  bytes of the buffer; 4,096 hold every key
/// @return 0; else -1 and an empty text: the host has none, or the caller may not read it
WEBAPI_API int QeloCgiGetPublicKey(char* text, int size);
/// Deciphers a "__cIpHeRtExT" value in place. @return 0 on failure
WEBAPI_API int QeloCgiDecryptParam(char* text);

}  // extern "C"
