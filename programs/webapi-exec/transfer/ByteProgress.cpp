#include "programs/webapi-exec/transfer/ByteProgress.h"

#include <algorithm>

namespace QELO::ExecProgram {
namespace {

constexpr int kWhole = 100;

}  // namespace

void ByteProgress::Begin(uint64_t done, uint64_t total) {
  done_ = done;
  total_ = total;
  hasBegun_ = true;
}

void ByteProgress::Add(uint64_t bytes) {
  done_ += bytes;
  if (!isSeen_ || !hasBegun_ || bytes == 0) {
    return;
  }
  if (done_ == total_) {
    screen_.ShowLast(Now());
  } else {
    screen_.Show(Now());
  }
}

Progress ByteProgress::Now() const {
  Progress progress;
  // Of an unknown whole there is always as much as came.
  progress.counts.push_back({"bytes", done_, total_ != 0 ? total_ : done_});
  if (total_ != 0) {
    const double part = static_cast<double>(done_) / static_cast<double>(total_);
    progress.percent = std::clamp(static_cast<int>(kWhole * part), 0, kWhole);
  }
  return progress;
}

}  // namespace QELO::ExecProgram
