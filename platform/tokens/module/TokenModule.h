#pragma once

/// Checks an access token against the database.
/// @param user   receives the token's user on success
/// @param error  receives the reason when the result is kTokenFailed
/// @return one of TokenResult
using TokenGrant = int (*)(const char* database, const char* token, const char* api,
                           const char* method, char* user, int size, char* error, int errorSize);

enum TokenResult : int {
  kTokenGranted = 1,
  kTokenUnknown = -1,
  kTokenExpired = -2,
  kTokenOtherCall = -3,
  kTokenFailed = -4  ///< the database cannot be asked
};

inline constexpr char kTokenModule[] = "tokens.so";
inline constexpr char kTokenGrant[] = "webapiTokenGrant";
