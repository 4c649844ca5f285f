#pragma once

#include "webapi/Export.h"

/// The host's access tokens and cloud service.
extern "C" {

/// Checks an access token for a call.
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
