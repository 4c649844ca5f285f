#include "platform/base/FileLock.h"

#include <sys/file.h>
#include <time.h>

#include <algorithm>
#include <cerrno>

namespace QELO::Platform {
namespace {

constexpr long kFirstPauseNs = 200'000;
constexpr long kLongestPauseNs = 5'000'000;
constexpr long kSecondNs = 1'000'000'000;

long long monotonicNs() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<long long>(now.tv_sec) * kSecondNs + now.tv_nsec;
}

}  // namespace

bool lockFile(int file, int seconds) {
  const long long deadline = monotonicNs() + static_cast<long long>(seconds) * kSecondNs;
  long pause = kFirstPauseNs;
  // The kernel's own waiting has no time limit but a signal, which belongs to the caller.
  while (flock(file, LOCK_EX | LOCK_NB) != 0) {
    const long long left = deadline - monotonicNs();
    if ((errno != EWOULDBLOCK && errno != EINTR) || left <= 0) {
      return false;
    }
    const timespec wait{0, static_cast<long>(std::min<long long>(pause, left))};
    nanosleep(&wait, nullptr);
    pause = std::min(pause + pause / 2, kLongestPauseNs);
  }
  return true;
}

}  // namespace QELO::Platform
