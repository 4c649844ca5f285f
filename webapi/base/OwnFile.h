#pragma once

#include <sys/stat.h>
#include <unistd.h>

#include <string>

namespace QELO {

/// Whether nobody but root and the effective user may change a file or directory.
inline bool IsOwnFile(const struct stat& info) {
  const bool isOurs = info.st_uid == 0 || info.st_uid == geteuid();
  return isOurs && (info.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

/// Whether others may change a file that is there, or put another in its place: what it says is
/// then not the host's word. Links are followed. A file that is missing has no such fault.
inline bool OthersMayChange(const std::string& path) {
  struct stat info {};
  if (stat(path.c_str(), &info) != 0) {
    return false;
  }
  const size_t slash = path.rfind('/');
  const std::string directory = slash == std::string::npos ? "." : path.substr(0, slash + 1);
  struct stat place {};
  return !IsOwnFile(info) || stat(directory.c_str(), &place) != 0 || !IsOwnFile(place);
}

}  // namespace QELO
