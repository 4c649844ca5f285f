#pragma once

#include <cerrno>
#include <cstdio>
#include <vector>

namespace QELO::Platform {

/// Reads an account file with one of glibc's readers, entry by entry.
/// @param read   fgetpwent_r, fgetgrent_r or fgetspent_r
/// @param visit  called with each entry, which lives until it returns; true ends the reading
/// @return false when the file cannot be read
template <typename Entry, typename Visit>
bool readDatabaseFile(const char* path, int (*read)(FILE*, Entry*, char*, size_t, Entry**),
                      Visit visit) {
  constexpr size_t kFirstSize = 1024;
  constexpr size_t kLargestLine = 1 << 20;  // bytes; a longer line is a broken file
  FILE* file = fopen(path, "re");
  if (file == nullptr) {
    return false;
  }
  std::vector<char> buffer(kFirstSize);
  int error = 0;
  bool done = false;
  while (!done && error == 0) {
    Entry entry;
    Entry* found = nullptr;
    error = read(file, &entry, buffer.data(), buffer.size(), &found);
    if (error == ERANGE && buffer.size() < kLargestLine) {
      buffer.resize(buffer.size() * 2);  // the same line is read again
      error = 0;
    } else if (error == 0) {
      done = found == nullptr || visit(*found);
    }
  }
  fclose(file);
  return error == 0 || error == ENOENT;  // ENOENT: the end of the file
}

}  // namespace QELO::Platform
