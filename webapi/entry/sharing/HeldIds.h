#pragma once

#include <sys/types.h>

#include <vector>

namespace QELO {

/// The process's group and user ids, kept while a sharing check runs with others.
class HeldIds {
 public:
  /// @return false when they cannot be read
  bool Save();
  /// Sets the ids again, groups before users, and the supplementary groups. What fails is logged,
  /// and that root's rights are back; after a failure nothing else is called in the process.
  /// @return false when one could not be set
  bool GiveBack() const;

 private:
  struct Ids {
    unsigned int real, effective, saved;
  };
  static bool Set(const char* call, int (*set)(unsigned, unsigned, unsigned), const Ids& ids);
  bool SetGroups() const;

  Ids group_{};
  Ids user_{};
  std::vector<gid_t> supplementary_;
};

}  // namespace QELO
