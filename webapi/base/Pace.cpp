#include "webapi/base/Pace.h"

#include <poll.h>

#include <algorithm>
#include <cerrno>

namespace QELO {
namespace {

using Clock = std::chrono::steady_clock;

/// Milliseconds for poll(), no fewer than there are.
int timeoutOf(std::chrono::nanoseconds time) {
  constexpr std::chrono::milliseconds kMost{std::chrono::hours{1}};
  return static_cast<int>(
      std::min(std::chrono::ceil<std::chrono::milliseconds>(time), kMost).count());
}

}  // namespace

std::chrono::nanoseconds Pace::Left() const {
  std::chrono::nanoseconds left = limits_.idle;
  if (limits_.leastRate != 0) {
    left = std::min<std::chrono::nanoseconds>(left, limits_.window - inWindow_);
  }
  if (limits_.longest.count() != 0) {
    left = std::min<std::chrono::nanoseconds>(left, limits_.longest - waited_);
  }
  return left;
}

int Pace::Await(int descriptor, short events) {
  const std::chrono::nanoseconds left = Left();
  if (left.count() <= 0) {
    return 0;
  }
  const Clock::time_point end = Clock::now() + left;
  pollfd one{descriptor, events, 0};
  int ready = 0;
  std::chrono::nanoseconds rest = left;
  do {
    ready = poll(&one, 1, timeoutOf(rest));
    rest = end - Clock::now();
  } while ((ready == 0 || (ready < 0 && errno == EINTR)) && rest.count() > 0);
  const std::chrono::nanoseconds waited = left - std::max(rest, std::chrono::nanoseconds(0));
  waited_ += waited;
  inWindow_ += waited;
  return ready < 0 && errno == EINTR ? 0 : ready;
}

void Pace::Add(uint64_t bytes) {
  moved_ += bytes;
  const uint64_t wanted = limits_.leastRate * static_cast<uint64_t>(limits_.window.count()) / 1000;
  if (moved_ >= wanted) {
    moved_ = 0;
    inWindow_ = std::chrono::nanoseconds(0);
  }
}

}  // namespace QELO
