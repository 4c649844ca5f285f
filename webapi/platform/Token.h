#pragma once

#include <json/json.h>

#include <string>

#include "webapi/Export.h"

/// The host's access tokens and cloud service.
extern "C" {

/// Checks an access token for a call from this process's client.
/// @param user  receives the name of the user whom the token stands for
/// @return a negative value when the token is unknown, expired or not for this call
WEBAPI_API int QeloAccessTokenGrant(const char* token, const char* api, const char* method,
                                    char* user, int size);

/// The text that stands for an AES key, 32 characters, by what a client sends along.
/// @param token  the number of an access token, which its owner knows
/// @param key    receives the text; "" on failure
/// @return a negative value when there is no such token, or it has expired
WEBAPI_API int QELOCloudServiceZttokenGenerateToken(const char* token, char* key, int size);

}  // extern "C"

/// What became of a user's wish.
enum QeloTokenResult : int {
  QELO_TOKEN_DONE = 0,
  QELO_TOKEN_BAD_TERMS = -1,  ///< they are not as they should be
  QELO_TOKEN_TOO_MANY = -2,   ///< the user has as many as one may have
  QELO_TOKEN_NONE = -3,       ///< the user has no such token
  QELO_TOKEN_FAILED = -4      ///< the tokens cannot be used (logged)
};

/// Makes an access token for a user.
/// @param terms   "name" (text), "scopes" (array of objects with the patterns "api" and "method"),
///                "readOnly" (boolean), "address" (address or network), "days"; all but the first
///                two may be missing
/// @param record  receives what QeloAccessTokenList() tells of it
/// @param token   receives the token, this once
/// @return QELO_TOKEN_DONE; else why not, and the outputs are as they were
WEBAPI_API int QeloAccessTokenCreate(const char* user, const Json::Value& terms,
                                     Json::Value& record, std::string& token);
/// A user's tokens.
/// @param records  receives an array of objects with "id", the terms, and as seconds since the
/// epoch
///                 "created", "expires" (0: never) and "used" (0: not yet)
/// @return QELO_TOKEN_DONE or QELO_TOKEN_FAILED
WEBAPI_API int QeloAccessTokenList(const char* user, Json::Value& records);
/// Removes a token of the user's. @return QELO_TOKEN_DONE, QELO_TOKEN_NONE or QELO_TOKEN_FAILED
WEBAPI_API int QeloAccessTokenRevoke(const char* user, long long id);
