#include "programs/server/metrics/Metrics.h"

#include <algorithm>
#include <numeric>

namespace QELO {

void Metrics::Times::Add(std::chrono::microseconds time) {
  const double seconds = std::chrono::duration<double>(time).count();
  const auto place = std::lower_bound(kBounds.begin(), kBounds.end(), seconds);
  ++counts[static_cast<size_t>(place - kBounds.begin())];
  sum += time;
}

uint64_t Metrics::Times::Count() const {
  return std::accumulate(counts.begin(), counts.end(), uint64_t{0});
}

void Metrics::CountRefusal(Service::Refusal reason) {
  switch (reason) {
    case Service::Refusal::kBusy:
      ++busy;
      break;
    case Service::Refusal::kSlow:
      ++slow;
      break;
    case Service::Refusal::kMalformed:
      ++malformed;
      break;
    case Service::Refusal::kTooLarge:
      ++tooLarge;
      break;
    case Service::Refusal::kTimedOut:
      break;  // it has had a process
  }
}

}  // namespace QELO
