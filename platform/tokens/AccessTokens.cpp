#include "platform/accounts/AccountDatabase.h"
#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/base/Secrets.h"
#include "platform/base/TextBuffer.h"
#include "platform/tokens/module/TokenModule.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Token.h"

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
  const int result = grant(QELO::Paths::kTokenDatabase, token, api, method, user, size, error,
                           static_cast<int>(sizeof error));
  if (result == kTokenFailed) {
    WEBAPI_LOG(kSource, "cannot check an access token [%s]", QELO::LogText(error).c_str());
  }
  if (result != kTokenGranted) {
    return result;
  }
  Account account;
  if (findAccount(user, account) != Lookup::kFound) {
    fillBuffer("", user, size);
    return kTokenUnknown;
  }
  return kTokenGranted;
}
