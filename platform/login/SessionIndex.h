#pragma once

#include <sys/types.h>

#include <string>

#include "platform/base/PrivateDir.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// The sessions of one account, so that a login need not look at everybody's: a directory below the
/// store with a second name, a hard link, of each of the account's session files. A file that has
/// lost its name in the store is no session any more.
class SessionIndex {
 public:
  /// @param store  the session directory's descriptor; must stay open
  SessionIndex(int store, const std::string& user, uid_t uid);

  /// Gives a session's file its second name; the directory is made when it is missing.
  /// @return false on failure, with errno
  bool Add(const std::string& id);
  void Remove(const std::string& id) const;
  /// Ends the account's sessions that were used longest ago until there are `limit`.
  /// @param kept  the session that is not looked at: it has just been made
  void Cap(size_t limit, const std::string& kept) const;

  /// Frees the files of the accounts within a share that are no sessions any more.
  static void Purge(int store, const PurgeShare& share);

 private:
  int store_;
  std::string name_;  ///< of the directory, below the store
  UniqueFd dir_;
};

}  // namespace QELO::Platform
