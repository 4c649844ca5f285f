#pragma once

#include <cstdint>

#include "programs/webapi-exec/follow/ProgressScreen.h"

namespace QELO::ExecProgram {

/// How much of something came, on the terminal.
class ByteProgress {
 public:
  /// @param isSeen  false: nothing is shown
  explicit ByteProgress(bool isSeen) : isSeen_(isSeen) {}

  /// @param total  0: not known
  void Begin(uint64_t done, uint64_t total);
  void Add(uint64_t bytes);
  bool IsWhole() const { return total_ == 0 || done_ == total_; }

 private:
  Progress Now() const;

  const bool isSeen_;
  ProgressScreen screen_;
  bool hasBegun_ = false;
  uint64_t done_ = 0;
  uint64_t total_ = 0;
};

}  // namespace QELO::ExecProgram
