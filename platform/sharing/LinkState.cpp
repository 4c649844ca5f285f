#include "platform/sharing/LinkState.h"

#include "platform/accounts/Accounts.h"
#include "platform/settings/Settings.h"

namespace QELO::Platform {

int sharingTimeout() {
  return Settings().GetNumber("sharing_timeout", 3600, 1, 366 * 86400);
}

bool isUsable(const StoredLink& link, int64_t now) {
  Account owner;
  return (link.expires == 0 || link.expires > now) &&
         findAccount(link.entry.ownerName, owner) == Lookup::kFound &&
         owner.uid == link.entry.ownerUid && usabilityOf(owner) == Usability::kGood;
}

}  // namespace QELO::Platform
