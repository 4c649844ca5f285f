#include <string>
#include <string_view>

#include "platform/accounts/Accounts.h"
#include "platform/base/IpAddress.h"
#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/base/Secrets.h"
#include "platform/base/TextBuffer.h"
#include "platform/ciphers/module/CipherModule.h"
#include "platform/tokens/ReadOnlyMethod.h"
#include "platform/tokens/UidOf.h"
#include "platform/tokens/module/TokenModule.h"
#include "webapi/base/Log.h"
#include "webapi/base/Number.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Token.h"

namespace QELO::Platform {
namespace {

constexpr int kAddressSize = 65;

/// Whether the account is still the one that the token was made for, and may use it. A service's
/// token is for an account that nobody logs in to.
bool isUsable(const TokenStore::Owner& owner) {
  Account account;
  if (findAccount(owner.user, account) != Lookup::kFound || account.uid != owner.uid) {
    return false;
  }
  const Usability usability = usabilityOf(account);
  return owner.isService ? usability != Usability::kExpired && usability != Usability::kUnknown
                         : usability == Usability::kGood;
}

/// An address that is not known is none of those that the token is for.
bool mayComeFromHere(const std::string& network) {
  if (network.empty()) {
    return true;
  }
  char text[kAddressSize] = {};
  IpAddress address;
  bool valid = false;
  return QeloCgiGetRemoteIP(text, kAddressSize) == 0 && IpAddress::Parse(text, address) &&
         address.IsIn(network, valid) && valid;
}

/// The key of an access token, which its owner can derive too and nobody else: from the token's
/// hash.
bool keyOf(int64_t id, std::string& text) {
  unsigned char hash[kTokenHashSize];
  const auto findHash = reinterpret_cast<TokenHash>(findInModule(kTokenModule, kTokenHash));
  const auto derive = reinterpret_cast<DeriveKeyText>(findInModule(kCipherModule, kDeriveKeyText));
  return findHash != nullptr && derive != nullptr &&
         findHash(Paths::kTokenDatabase, uidOf, id, hash) == kTokenGranted && derive(hash, &text);
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
  const auto accept = [&](const TokenStore::Entry& entry) {
    if (!isUsable(entry.owner)) {
      return TokenStore::Grant::kUnknown;
    }
    return mayComeFromHere(entry.address) && (!entry.readOnly || isReadOnlyMethod(api, method)) &&
                   entry.owner.user.size() < static_cast<size_t>(size)
               ? TokenStore::Grant::kGranted
               : TokenStore::Grant::kOtherCall;
  };
  TokenStore::Entry entry;
  std::string error;
  const int result =
      grant(QELO::Paths::kTokenDatabase, uidOf, token, api, method, accept, entry, error);
  if (result == kTokenFailed) {
    WEBAPI_LOG(kSource, "cannot check an access token [%s]", QELO::LogText(error).c_str());
  }
  if (result == kTokenGranted) {
    fillBuffer(entry.owner.user, user, size);
  }
  return result;
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
