#pragma once

#include <cstddef>

/// While it lives, no block of memory is had that is larger than this.
class ScarceMemory {
 public:
  explicit ScarceMemory(std::size_t largest);
  ScarceMemory(const ScarceMemory&) = delete;
  ScarceMemory& operator=(const ScarceMemory&) = delete;
  ~ScarceMemory();
};
