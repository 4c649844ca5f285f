#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <string>

#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// Opens a regular file for reading; the last component may be no symbolic link.
/// @param dir   directory descriptor that a relative name starts from, or AT_FDCWD
/// @param info  receives the file's status on success
/// @return 0, or the errno of the failure; EINVAL when it is something else than a regular file
int openRegularFile(int dir, const char* name, UniqueFd& file, struct stat& info);

/// Reads an open file whole. @return false when it is larger than `limit` bytes or cannot be read
bool readText(int file, size_t limit, std::string& text);

/// Writes all of it. @return false on failure
bool writeText(int file, const std::string& text);

}  // namespace QELO::Platform
