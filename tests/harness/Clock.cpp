#include "tests/harness/Clock.h"

#include <sys/syscall.h>
#include <sys/time.h>
#include <unistd.h>

namespace QELO {

time_t& Clock::Stopped() {
  static time_t now = 0;
  return now;
}

}  // namespace QELO

// These take the place of the C library's for the whole test program.
#pragma GCC visibility push(default)
extern "C" {

int clock_gettime(clockid_t clock, timespec* time) noexcept {
  const bool isOfTheDay = clock == CLOCK_REALTIME || clock == CLOCK_REALTIME_COARSE;
  if (isOfTheDay && QELO::Clock::Stopped() != 0) {
    *time = {QELO::Clock::Stopped(), 0};
    return 0;
  }
  return static_cast<int>(syscall(SYS_clock_gettime, clock, time));
}

time_t time(time_t* result) noexcept {
  timespec now{};
  clock_gettime(CLOCK_REALTIME, &now);
  if (result != nullptr) {
    *result = now.tv_sec;
  }
  return now.tv_sec;
}

int gettimeofday(timeval* result, void*) noexcept {
  timespec now{};
  clock_gettime(CLOCK_REALTIME, &now);
  *result = {now.tv_sec, now.tv_nsec / 1000};
  return 0;
}

}  // extern "C"
#pragma GCC visibility pop
