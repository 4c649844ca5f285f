#pragma once

#include <map>
#include <string>

/// A host that runs short, while it lives: of disk space and of memory for hashes.
class ScarceHost {
 public:
  ScarceHost();
  ScarceHost(const ScarceHost&) = delete;
  ScarceHost& operator=(const ScarceHost&) = delete;
  ~ScarceHost();

  /// Bytes that are free on the file system of a path; one that is not here cannot be asked.
  std::map<std::string, unsigned long long> freeBytes;
  int hashesLeft = -1;  ///< how many more can be made; -1: any number
};
