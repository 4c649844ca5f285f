#pragma once

#include <chrono>
#include <vector>

#include "webapi/base/UniqueFd.h"

namespace QELO {

/// The descriptors that a server waits for, all at once.
class Events {
 public:
  static constexpr std::chrono::milliseconds kWithoutEnd{-1};

  /// @return false, with errno, when that cannot be had
  bool Open();
  /// From now on it is waited for something to read there.
  bool Watch(int descriptor);
  /// Always before it is closed: a child may have it open, and then the kernel goes on to report
  /// it.
  void Unwatch(int descriptor);
  /// Waits, and gives the descriptors that something has come by.
  /// @param limit  kWithoutEnd: as long as it takes
  std::vector<int> Wait(std::chrono::milliseconds limit);

 private:
  UniqueFd events_;
};

}  // namespace QELO
