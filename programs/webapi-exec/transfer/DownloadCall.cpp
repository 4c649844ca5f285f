#include "programs/webapi-exec/transfer/DownloadCall.h"

#include <algorithm>

namespace QELO::ExecProgram {
namespace {

constexpr int kWhole = 100;

}  // namespace

DownloadCall::DownloadCall(const ExecParam& param, OutputFile& file, bool isSeen)
    : ExecHandler(param), file_(file), isSeen_(isSeen) {}

void DownloadCall::OutputBegins(const std::string& head) {
  file_.Begin(head);
  done_ = file_.Done();
  hasBegun_ = true;
}

void DownloadCall::OutputGrows(size_t bytes) {
  done_ += bytes;
  if (!isSeen_ || !hasBegun_) {
    return;
  }
  if (done_ == file_.Total()) {
    screen_.ShowLast(Now());
  } else {
    screen_.Show(Now());
  }
}

Progress DownloadCall::Now() const {
  Progress progress;
  const uint64_t total = file_.Total();
  // Of an unknown whole there is always as much as came.
  progress.counts.push_back({"bytes", done_, total != 0 ? total : done_});
  if (total != 0) {
    const double part = static_cast<double>(done_) / static_cast<double>(total);
    progress.percent = std::clamp(static_cast<int>(kWhole * part), 0, kWhole);
  }
  return progress;
}

}  // namespace QELO::ExecProgram
