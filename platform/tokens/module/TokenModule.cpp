#include "platform/tokens/module/TokenModule.h"

#include <time.h>

#include "webapi/Export.h"

using QELO::Platform::TokenStore;

namespace {

int resultOf(TokenStore::Grant grant) {
  switch (grant) {
    case TokenStore::Grant::kGranted:
      return kTokenGranted;
    case TokenStore::Grant::kUnknown:
      return kTokenUnknown;
    case TokenStore::Grant::kExpired:
      return kTokenExpired;
    case TokenStore::Grant::kOtherCall:
      return kTokenOtherCall;
    default:
      return kTokenFailed;
  }
}

bool create(TokenStore& store, TokenWork& work) {
  std::vector<TokenStore::Entry> there;
  if (!store.List(&work.entry.owner, there)) {
    return false;
  }
  work.done = there.size() < work.most;
  return !work.done || store.Create(work.entry, work.token);
}

}  // namespace

extern "C" WEBAPI_API int webapiTokenGrant(const char* database, TokenStore::FindUid findUid,
                                           const char* token, const char* api, const char* method,
                                           const TokenStore::Accept& accept,
                                           TokenStore::Entry& entry, std::string& error) {
  TokenStore store;
  TokenStore::Grant grant = TokenStore::Grant::kFailed;
  if (store.Open(database, false, findUid)) {
    grant = store.Check(token, api, method, time(nullptr), accept, entry);
  } else if (store.Missing()) {
    grant = TokenStore::Grant::kUnknown;  // no token was ever made
  }
  error = grant == TokenStore::Grant::kFailed ? store.Error() : "";
  return resultOf(grant);
}

extern "C" WEBAPI_API int webapiTokenHash(const char* database, TokenStore::FindUid findUid,
                                          int64_t id, unsigned char* hash) {
  TokenStore store;
  return store.Open(database, false, findUid) && store.FindHash(id, time(nullptr), hash)
             ? kTokenGranted
             : kTokenUnknown;
}

extern "C" WEBAPI_API bool webapiTokenManage(const char* database, TokenStore::FindUid findUid,
                                             TokenWork& work) {
  TokenStore store;
  bool good = store.Open(database, work.kind == TokenWork::kCreate, findUid);
  if (!good && store.Missing() && work.kind != TokenWork::kCreate) {
    return true;  // no token was ever made
  }
  if (good && work.kind == TokenWork::kCreate) {
    good = create(store, work);
  } else if (good && work.kind == TokenWork::kList) {
    good = work.done = store.List(&work.entry.owner, work.entries);
  } else if (good) {
    good = store.Revoke(work.entry.id, &work.entry.owner, work.done);
  }
  work.error = good ? "" : store.Error();
  return good;
}
