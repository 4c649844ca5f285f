#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

#include "platform/tokens/module/TokenStore.h"

/// What the module of access tokens offers to the platform, which loads it. Each names the database
/// and how the id of an account's user is found, which a database of the first version asks for.

enum TokenResult : int {
  kTokenGranted = 1,
  kTokenUnknown = -1,
  kTokenExpired = -2,
  kTokenOtherCall = -3,
  kTokenFailed = -4  ///< the database cannot be asked
};

/// Checks an access token for a call.
/// @param entry  receives the token's when it is granted
/// @param error  receives the reason when the result is kTokenFailed
/// @return one of TokenResult
using TokenGrant = int (*)(const char* database, QELO::Platform::TokenStore::FindUid findUid,
                           const char* token, const char* api, const char* method,
                           const QELO::Platform::TokenStore::Accept& accept,
                           QELO::Platform::TokenStore::Entry& entry, std::string& error);

inline constexpr int kTokenHashSize = 32;

/// The SHA-256 of the access token with this number, while it is good.
/// @param hash  receives kTokenHashSize bytes
/// @return kTokenGranted, or why there is none
using TokenHash = int (*)(const char* database, QELO::Platform::TokenStore::FindUid findUid,
                          int64_t id, unsigned char* hash);

/// What a user does with the own tokens, whose owner the entry names.
struct TokenWork {
  enum Kind { kCreate, kList, kRevoke } kind = kList;
  QELO::Platform::TokenStore::Entry entry;  ///< the new one, the owner, or the one to revoke
  size_t most = 0;                          ///< tokens that its owner may have
  std::string token;                        ///< receives the new one
  std::vector<QELO::Platform::TokenStore::Entry> entries;  ///< receives the list
  bool done = false;  ///< receives whether it was made: not more than allowed, or found
  std::string error;  ///< receives why the database could not be used
};
/// @return false when the database cannot be used
using TokenManage = bool (*)(const char* database, QELO::Platform::TokenStore::FindUid findUid,
                             TokenWork& work);

inline constexpr char kTokenModule[] = "tokens.so";
inline constexpr char kTokenGrant[] = "webapiTokenGrant";
inline constexpr char kTokenHash[] = "webapiTokenHash";
inline constexpr char kTokenManage[] = "webapiTokenManage";
