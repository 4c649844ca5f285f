#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace QELO {

/// The process's group and user ids, saved before a method takes others and given back after it.
/// Every change made here is logged to the authorisation facility.
class Credentials {
 public:
  /// @return false when the ids cannot be read
  bool Save();
  /// Whether the ids or the supplementary groups are no longer the saved ones.
  bool HaveChanged() const;
  /// Sets the saved ids again, and the supplementary groups where they have changed; failures are
  /// logged. For the groups a process that is not root becomes root first: a call that runs later
  /// must not have the groups of the user before.
  /// @return false when one of them could not be set: the credentials are lost from then on
  bool GiveBack() const;

  /// Whether the process has kept something of a method's credentials that it was to give back.
  /// Then nothing else may be called in it.
  static bool AreLost() { return areLost_; }
  static void Lose() { areLost_ = true; }

  /// Makes root the effective group and user, where they are not.
  /// @return false, with errno, when that is refused
  static bool BecomeRoot();
  /// Takes a user's credentials, for good unless the privilege is kept. A process that may not
  /// regain root passes when it already runs as that user.
  static bool BecomeUser(const std::string& name, bool keepPrivilege);

 private:
  struct Ids {
    unsigned int real, effective, saved;
  };
  static bool SetIds(const char* call, int (*set)(unsigned, unsigned, unsigned), const Ids& ids);

  static bool areLost_;
  Ids group_{};
  Ids user_{};
  std::vector<gid_t> supplementary_;
};

}  // namespace QELO
