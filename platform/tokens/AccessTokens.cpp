#include "platform/accounts/Accounts.h"
#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/base/Secrets.h"
#include "platform/base/TextBuffer.h"
#include "platform/tokens/module/TokenModule.h"
#include "webapi/base/Log.h"
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
