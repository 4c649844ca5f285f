#include "platform/accounts/ShadowEntry.h"

#include <time.h>

namespace QELO::Platform {
namespace {

constexpr long kDaySeconds = 86400;

long today() {
  return time(nullptr) / kDaySeconds;
}

/// Days since the password was changed; negative when that is not known.
long ageOf(const ShadowEntry& entry) {
  return entry.changed < 0 ? -1 : today() - entry.changed;
}

}  // namespace

ShadowEntry::ShadowEntry(const spwd& entry)
    : hash(entry.sp_pwdp != nullptr ? entry.sp_pwdp : ""),
      changed(entry.sp_lstchg),
      longest(entry.sp_max),
      grace(entry.sp_inact),
      expiry(entry.sp_expire) {}

bool ShadowEntry::HasExpired() const {
  const bool isOver = longest >= 0 && grace >= 0 && ageOf(*this) - longest > grace;
  return isOver || (expiry >= 0 && today() >= expiry);
}

bool ShadowEntry::MustChange() const {
  return changed == 0 || (longest >= 0 && ageOf(*this) > longest);
}

}  // namespace QELO::Platform
