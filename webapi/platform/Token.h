#pragma once

#include "webapi/Export.h"

/// The host's access tokens and cloud service.
extern "C" {

/// Checks an access token for a call.
/// @param user  receives the name of the user whom the token stands for
/// @return a negative value when the token is unknown, expired or not for this call
WEBAPI_API int QeloAccessTokenGrant(const char* token, const char* api, const char* method,
                                    char* user, int size);

/// Derives an AES key's text from a client's token. @return a negative value on failure
WEBAPI_API int QELOCloudServiceZttokenGenerateToken(const char* token, char* key, int size);

}  // extern "C"
