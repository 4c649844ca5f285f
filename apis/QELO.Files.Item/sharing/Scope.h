#pragma once

#include <string>

namespace files {

/// Whether a path is the one that a link shares, or leads below it. One with an empty part, "." or
/// ".." is none, for the API as well as here.
/// @param shared  the link's path; one that is not absolute shares nothing
inline bool isWithin(const std::string& path, std::string shared) {
  if (shared.empty() || shared[0] != '/') {
    return false;
  }
  while (!shared.empty() && shared.back() == '/') {
    shared.pop_back();
  }
  const std::string ending = path + "/";
  for (const char* part : {"//", "/./", "/../"}) {
    if (ending.find(part) != std::string::npos) {
      return false;
    }
  }
  return path.rfind(shared, 0) == 0 && (path.size() == shared.size() || path[shared.size()] == '/');
}

}  // namespace files
