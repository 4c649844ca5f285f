#pragma once

#include <sys/types.h>

#include <cstdint>

/// Checks an access token against the database.
/// @param findUid  the id of an account's user, -1 when there is none: asked once, for a database
///                 of the first version
/// @param user, uid, isService  receive whom the token stands for on success
/// @param error  receives the reason when the result is kTokenFailed
/// @return one of TokenResult
using TokenGrant = int (*)(const char* database, const char* token, const char* api,
                           const char* method, uid_t (*findUid)(const char* user), char* user,
                           int size, uid_t* uid, int* isService, char* error, int errorSize);

inline constexpr int kTokenHashSize = 32;

/// The SHA-256 of the access token with this number, while it is good.
/// @param hash  receives kTokenHashSize bytes
/// @return kTokenGranted, or why there is none
using TokenHash = int (*)(const char* database, int64_t id, uid_t (*findUid)(const char* user),
                          unsigned char* hash);

enum TokenResult : int {
  kTokenGranted = 1,
  kTokenUnknown = -1,
  kTokenExpired = -2,
  kTokenOtherCall = -3,
  kTokenFailed = -4  ///< the database cannot be asked
};

inline constexpr char kTokenModule[] = "tokens.so";
inline constexpr char kTokenGrant[] = "webapiTokenGrant";
inline constexpr char kTokenHash[] = "webapiTokenHash";
