#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// The directory of one user's store: named after the user id, mode 0700, owned by that user, in a
/// parent where everybody may make a directory and nobody remove another's.
class StoreDirectory {
 public:
  enum class Result {
    kOpen,
    kMissing,
    kRefused  ///< see Error()
  };

  /// @param create  makes the directory, and its parent, when missing; only a user's own is made
  Result Open(const std::string& parent, uid_t store, bool create);

  int Fd() const { return fd_.Get(); }
  /// Absolute, and without symbolic links.
  const std::string& Path() const { return path_; }
  gid_t Group() const { return group_; }
  const std::string& Error() const { return error_; }

 private:
  Result OpenChild(int parent, const std::string& name, uid_t store, bool create);
  Result Refuse(const char* reason);

  UniqueFd fd_;
  std::string path_;
  gid_t group_ = 0;
  std::string error_;
};

/// The users who have a directory of their own in the parent. @return none when it cannot be read
std::vector<uid_t> listStores(const std::string& parent);

}  // namespace QELO::Platform
