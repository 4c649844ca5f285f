#pragma once

#include <sys/types.h>

#include <vector>

namespace QELO {

/// The ids that the process of a made-up host has: its own geteuid() and the like tell them, and
/// changing them needs no rights but those that they stand for.
struct Ids {
  struct Set {
    uid_t real, effective, saved;
  };
  Set user;
  Set group;
  std::vector<gid_t> groups;

  /// Those in use. They begin as the real ones.
  static Ids& Get();
  /// Back to the real ones.
  static void Reset();
  /// As a switch to an account: all ids, or the effective ones alone.
  static void Become(uid_t uid, gid_t gid, bool keepPrivilege);
};

}  // namespace QELO
