#include <time.h>

#include "platform/base/IpAddress.h"
#include "platform/base/Secrets.h"
#include "platform/sharing/LinkConnection.h"
#include "platform/sharing/LinkState.h"
#include "platform/sharing/LinkStore.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Sharing.h"

namespace QELO::Platform {
namespace {

/// Results of QeloSharingIsAuthorized.
enum Authorization : int {
  kOtherAddress = -8,
  kOtherLink = -7,
  kRefused = -6,
  kNoSession = -5,
  kMalformed = -4,
  kBroken = -3,
  kNoLink = -2,
  kTimedOut = -1,
  kAuthorized = 1
};

bool isSameAddress(const std::string& opened, const char* now) {
  IpAddress first;
  IpAddress second;
  return now != nullptr && IpAddress::Parse(opened, first) && IpAddress::Parse(now, second) &&
         first == second;
}

int broken(const LinkStore& store) {
  WEBAPI_LOG("Authorization.cpp", "cannot ask for a sharing link [%s]",
             LogText(store.Error()).c_str());
  return kBroken;
}

/// @param address  the client's
int checkSession(LinkStore& store, const StoredLink& link, const char* sid, const char* address,
                 int64_t now) {
  StoredSession session;
  int64_t opened = 0;
  LinkStore::Result found = store.FindSession(sid, session);
  if (found != LinkStore::Result::kDone) {
    return found == LinkStore::Result::kAbsent ? kNoSession : broken(store);
  }
  found = store.FindToken(session.id, link.entry.id, opened);
  if (found == LinkStore::Result::kFailed) {
    return broken(store);
  }
  if (found != LinkStore::Result::kDone || session.ownerUid != link.entry.ownerUid) {
    return kOtherLink;
  }
  if (link.entry.enableMatchIp && !isSameAddress(session.address, address)) {
    return kOtherAddress;
  }
  if (session.ends <= now) {
    return kTimedOut;
  }
  // Not at each call: that would be a write for each.
  const int timeout = sharingTimeout();
  if (session.ends - now < timeout / 2) {
    store.Extend(session.id, now + timeout);
  }
  return kAuthorized;
}

int authorize(const char* id, const char* sid, const QeloSharingVisit& visit) {
  if (id == nullptr) {
    return kNoLink;
  }
  if (!isSecretText(id) || (sid != nullptr && !isSecretText(sid))) {
    return kMalformed;
  }
  if (!hasLinkStore()) {
    return kNoLink;  // no link was ever made
  }
  LinkStore* store = LinkConnection::Get();
  if (store == nullptr) {
    return kBroken;
  }
  StoredLink link;
  const LinkStore::Result found = store->FindLink(id, link);
  if (found != LinkStore::Result::kDone) {
    return found == LinkStore::Result::kAbsent ? kNoLink : broken(*store);
  }
  const int64_t now = time(nullptr);
  if (!isUsable(link, now)) {
    return kRefused;
  }
  if (link.entry.protectType != sharing::SHARING_PROTECT_NONE) {
    const int session =
        sid == nullptr ? kNoSession : checkSession(*store, link, sid, visit.address, now);
    if (session != kAuthorized) {
      return session;
    }
  }
  return link.maxBytes != 0 && visit.bodySize > link.maxBytes ? kRefused : kAuthorized;
}

}  // namespace
}  // namespace QELO::Platform

extern "C" int QeloSharingIsAuthorized(const char* sharingId, const char* sharingSid,
                                       const QeloSharingVisit* visit) {
  using namespace QELO::Platform;
  const int result = visit == nullptr ? kRefused : authorize(sharingId, sharingSid, *visit);
  LinkConnection::Drop();
  return result;
}
