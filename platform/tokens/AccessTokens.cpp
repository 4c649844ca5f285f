#include <string>
#include <string_view>

#include "platform/accounts/Accounts.h"
#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/base/Secrets.h"
#include "platform/base/TextBuffer.h"
#include "platform/ciphers/module/CipherModule.h"
#include "platform/tokens/module/TokenModule.h"
#include "webapi/base/Log.h"
#include "webapi/base/Number.h"
#include "webapi/platform/Token.h"

namespace QELO::Platform {
namespace {

uid_t uidOf(const char* user) {
  Account account;
  return findAccount(user, account) == Lookup::kFound ? account.uid : static_cast<uid_t>(-1);
}

/// Whether the account is still the one that the token was made for, and may use it. A service's
/// token is for an account that nobody logs in to.
bool isUsable(const char* user, uid_t uid, bool isService) {
  Account account;
  if (findAccount(user, account) != Lookup::kFound || account.uid != uid) {
    return false;
  }
  const Usability usability = usabilityOf(account);
  return isService ? usability != Usability::kExpired && usability != Usability::kUnknown
                   : usability == Usability::kGood;
}

/// The key of an access token, which its owner can derive too and nobody else: from the token's
/// hash.
bool keyOf(int64_t id, std::string& text) {
  unsigned char hash[kTokenHashSize];
  const auto findHash = reinterpret_cast<TokenHash>(findInModule(kTokenModule, kTokenHash));
  const auto derive = reinterpret_cast<DeriveKeyText>(findInModule(kCipherModule, kDeriveKeyText));
  return findHash != nullptr && derive != nullptr &&
         findHash(QELO::Paths::kTokenDatabase, id, uidOf, hash) == kTokenGranted &&
         derive(hash, &text);
}

}  // namespace
}  // namespace QELO::Platform

using namespace QELO::Platform;

extern "C" int QeloAccessTokenGrant(const char* token, const char* api, const char* method,
                                    char* user, int size) {
  constexpr char kSource[] = "AccessTokens.cpp";
  fillBuffer("", user, size);
  if (token == nullptr || api == nullptr || method == nullptr || !isSecretText(token)) {
    return kTokenUnknown;
  }
  const auto grant = reinterpret_cast<TokenGrant>(findInModule(kTokenModule, kTokenGrant));
  if (grant == nullptr) {
    return kTokenFailed;
  }
  char error[256] = "";
  uid_t uid = 0;
  int isService = 0;
  const int result = grant(QELO::Paths::kTokenDatabase, token, api, method, uidOf, user, size, &uid,
                           &isService, error, static_cast<int>(sizeof error));
  if (result == kTokenFailed) {
    WEBAPI_LOG(kSource, "cannot check an access token [%s]", QELO::LogText(error).c_str());
  }
  if (result != kTokenGranted) {
    return result;
  }
  if (!isUsable(user, uid, isService != 0)) {
    fillBuffer("", user, size);
    return kTokenUnknown;
  }
  return kTokenGranted;
}

// What clients send along is the number of an access token, which is no secret.
extern "C" int QELOCloudServiceZttokenGenerateToken(const char* token, char* key, int size) {
  fillBuffer("", key, size);
  int64_t id = 0;
  std::string text;
  return token != nullptr && QELO::ParseNumber(std::string_view(token), id) && id > 0 &&
                 keyOf(id, text) && fillBuffer(text, key, size)
             ? 0
             : -1;
}
