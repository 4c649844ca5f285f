#pragma once

#include <shadow.h>

#include <string>

namespace QELO::Platform {

/// What the shadow database keeps of an account. Days are counted from 1970-01-01; a negative
/// number is none.
struct ShadowEntry {
  std::string hash;
  long changed = -1;  ///< day of the password's last change; 0: it must be changed
  long longest = -1;  ///< days that a password lasts
  long grace = -1;    ///< days after that in which it can still be changed
  long expiry = -1;   ///< first day on which the account is no more

  ShadowEntry() = default;
  explicit ShadowEntry(const spwd& entry);

  /// The administrator put a "!" before the hash. Not so "*": no password opens such an account,
  /// but what else PAM asks may.
  bool IsLocked() const { return !hash.empty() && hash[0] == '!'; }
  /// The account's last day is over, or that on which its old password could be changed.
  bool HasExpired() const;
  /// The password must be changed before the next login.
  bool MustChange() const;
};

}  // namespace QELO::Platform
