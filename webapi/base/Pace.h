#pragma once

#include <chrono>
#include <cstdint>

namespace QELO {

/// How slow the other end of a transfer may be.
struct PaceLimits {
  std::chrono::milliseconds idle{30'000};    ///< without a byte
  std::chrono::milliseconds window{60'000};  ///< what the rate is an average of
  uint64_t leastRate = 256;                  ///< bytes a second; 0: any
  std::chrono::milliseconds longest{0};      ///< of waiting in all; 0: without end
};

/// Waits for the other end of a transfer, and for no longer than that is worth. Waiting alone is
/// counted: who keeps this process busy is not slow, and what a disk of ours takes is nobody's
/// fault.
class Pace {
 public:
  explicit Pace(const PaceLimits& limits) : limits_(limits) {}

  /// Waits until a descriptor is ready.
  /// @param events  as poll() has them
  /// @return what poll() returns: above 0 when it is, 0 when the other end is too slow, and every
  ///         time from then on; below 0 with errno
  int Await(int descriptor, short events);
  /// Bytes have been moved.
  void Add(uint64_t bytes);

 private:
  std::chrono::nanoseconds Left() const;

  PaceLimits limits_;
  std::chrono::nanoseconds waited_{0};    ///< in all
  std::chrono::nanoseconds inWindow_{0};  ///< since the window began
  uint64_t moved_ = 0;                    ///< bytes since then
};

}  // namespace QELO
