#include "platform/tokens/module/TokenModule.h"

#include <time.h>

#include "platform/base/TextBuffer.h"
#include "platform/tokens/module/TokenStore.h"
#include "webapi/Export.h"

using QELO::Platform::fillBuffer;
using QELO::Platform::TokenStore;

extern "C" WEBAPI_API int webapiTokenGrant(const char* database, const char* token, const char* api,
                                           const char* method, uid_t (*findUid)(const char* user),
                                           char* user, int size, uid_t* uid, int* isService,
                                           char* error, int errorSize) {
  TokenStore store;
  TokenStore::Owner owner;
  TokenStore::Grant grant = TokenStore::Grant::kFailed;
  if (store.Open(database, false, findUid)) {
    grant = store.Check(token, api, method, time(nullptr), owner);
  } else if (store.Missing()) {
    grant = TokenStore::Grant::kUnknown;  // no token was ever made
  }
  switch (grant) {
    case TokenStore::Grant::kGranted:
      *uid = owner.uid;
      *isService = owner.isService ? 1 : 0;
      return fillBuffer(owner.user, user, size) ? kTokenGranted : kTokenOtherCall;
    case TokenStore::Grant::kUnknown:
      return kTokenUnknown;
    case TokenStore::Grant::kExpired:
      return kTokenExpired;
    case TokenStore::Grant::kOtherCall:
      return kTokenOtherCall;
    default:
      fillBuffer(store.Error().substr(0, static_cast<size_t>(errorSize) - 1), error, errorSize);
      return kTokenFailed;
  }
}

extern "C" WEBAPI_API int webapiTokenHash(const char* database, int64_t id,
                                          uid_t (*findUid)(const char* user), unsigned char* hash) {
  TokenStore store;
  return store.Open(database, false, findUid) && store.FindHash(id, time(nullptr), hash)
             ? kTokenGranted
             : kTokenUnknown;
}
