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
  /// Whether the effective ids are no longer the saved ones.
  bool HaveChanged() const;
  /// Sets the saved ids again; failures are logged.
  void GiveBack() const;

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
  Ids group_{};
  Ids user_{};
  std::vector<gid_t> supplementary_;
};

}  // namespace QELO
