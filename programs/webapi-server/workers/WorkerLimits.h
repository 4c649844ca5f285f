#pragma once

#include <chrono>
#include <cstddef>

namespace QELO {

/// What processes that stay may be and take.
struct WorkerLimits {
  unsigned fronts = 0;            ///< processes that take requests in; 0: no workers
  unsigned workers = 64;          ///< processes that run methods, a quarter of them for one account
  unsigned calls = 1000;          ///< that a worker serves before it ends
  std::chrono::seconds idle{60};  ///< without a call before it ends
  std::chrono::seconds call{3600};   ///< life of a call; then its worker is killed
  size_t memory = size_t{64} << 20;  ///< bytes that a worker may have taken after a call
};

}  // namespace QELO
