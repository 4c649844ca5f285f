#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// Opens a directory of secrets. It must be nobody else's: owned by root or by the effective user,
/// with no right for others, and no symbolic link.
/// @param create  it and its parents are created when missing
/// @return a path descriptor to open files below; on failure none, with errno; EPERM when others
///         may use the directory
UniqueFd openPrivateDir(const char* path, bool create);

/// Which names of a directory one purge looks at: all of them, or of many a share that is drawn
/// anew each time, so that whoever's call happens to purge does not wait for thousands.
class PurgeShare {
 public:
  /// Names that one purge looks at, about.
  static constexpr size_t kMost = 5000;

  /// @param names  that the directory has, about
  explicit PurgeShare(size_t names);
  bool Has(std::string_view name) const;

 private:
  size_t shares_;
  size_t drawn_;
};

/// Removes the regular files that were last written more than `age` seconds ago, but those whose
/// name starts with a dot, within the share that is drawn.
/// @param pause  nothing is done when this was called less than so many seconds ago
/// @return the share that was looked at, or none when it was not done
std::optional<PurgeShare> purgeFiles(int dir, long age, long pause);

}  // namespace QELO::Platform
