#pragma once

#include <fcntl.h>
#include <sys/stat.h>

#include <cstddef>
#include <string>
#include <string_view>

#include "webapi/base/UniqueFd.h"

namespace QELO {

/// Opens a regular file for reading.
/// @param dir   directory descriptor that a relative name starts from, or AT_FDCWD
/// @param info  receives the file's status on success
/// @param link  O_NOFOLLOW: the last component may be no symbolic link; 0: it may
/// @return 0, or the errno of the failure; EINVAL when it is something else than a regular file
int OpenRegularFile(int dir, const char* name, UniqueFd& file, struct stat& info,
                    int link = O_NOFOLLOW);

/// Reads an open file to its end.
/// @param text  what was read, also on failure
/// @return false when it is larger than `limit` bytes or cannot be read
bool ReadText(int file, size_t limit, std::string& text);

/// Writes all of it, waiting where a pipe or socket has no room. @return false on failure
bool WriteText(int file, std::string_view text);

}  // namespace QELO
