#pragma once

#include <cstddef>

namespace QELO {

/// Bounds the memory of a process until its caller is known: a second line behind the limits on
/// what a request may hold. Beyond it allocations fail, as without any memory left.
///
/// What is bounded is the address space (RLIMIT_AS), the soft limit alone, so that methods, which
/// may need more and are trusted, and the processes that they start have the limit that the web
/// server gave.
class MemoryBound {
 public:
  /// Sets the bound, unless the limit is lower already, or it cannot be told how much the process
  /// has. Builds with the address sanitizer, whose own use is without bound, have none.
  /// @param bytes  of address space beyond what the process has now
  static void Set(size_t bytes);
  /// Measures what the process has, for the children that it forks from now on: Set() takes theirs
  /// for the same, since asking costs a request more than anything else that it asks the kernel.
  static void Measure();
  /// Gives the former limit back. Nothing without Set(), and the second time.
  static void Lift();
};

}  // namespace QELO
