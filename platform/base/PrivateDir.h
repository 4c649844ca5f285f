#pragma once

#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// Opens a directory of secrets. It must be nobody else's: owned by root or by the effective user,
/// with no right for others, and no symbolic link.
/// @param create  it and its parents are created when missing
/// @return a path descriptor to open files below; on failure none, with errno; EPERM when others
///         may use the directory
UniqueFd openPrivateDir(const char* path, bool create);

/// Removes the regular files that were last written more than `age` seconds ago, but those whose
/// name starts with a dot.
/// @param pause  nothing is done when this was called less than so many seconds ago
/// @return whether it was done
bool purgeFiles(int dir, long age, long pause);

}  // namespace QELO::Platform
