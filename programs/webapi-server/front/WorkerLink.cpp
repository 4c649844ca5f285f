#include "programs/webapi-server/front/WorkerLink.h"

#include <arpa/inet.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>

namespace QELO {
namespace {

using Clock = std::chrono::steady_clock;

/// Longest message that is in the socket as a whole, in bytes: well within its buffer.
constexpr size_t kLongestWhole = size_t{64} << 10;
constexpr std::chrono::microseconds kPause{200};  ///< while the rest of a message is on its way

}  // namespace

WorkerLink::WorkerLink(UniqueFd socket, const qelodaemon::Limits& limits)
    : SockConnection(socket.Release(), limits) {}

WorkerLink::Coming WorkerLink::Await(std::chrono::milliseconds patience) const {
  const Clock::time_point end = Clock::now() + patience;
  for (;;) {
    uint32_t announced = 0;
    const ssize_t count = TEMP_FAILURE_RETRY(
        recv(descriptor_, &announced, sizeof announced, MSG_PEEK | MSG_DONTWAIT));
    if (count == 0 || (count < 0 && errno != EAGAIN)) {
      return count < 0 && errno == ECONNRESET ? Coming::kUntaken : Coming::kGone;
    }
    if (count == sizeof announced) {
      int here = 0;
      const size_t length = sizeof announced + ntohl(announced);
      if (length > kLongestWhole) {
        return Coming::kLater;
      }
      if (ioctl(descriptor_, FIONREAD, &here) == 0 && static_cast<size_t>(here) >= length) {
        return Coming::kWhole;
      }
    }
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - Clock::now()).count();
    if (left <= 0) {
      return Coming::kLater;
    }
    if (count > 0) {
      usleep(static_cast<useconds_t>(kPause.count()));
    } else {
      pollfd state{descriptor_, POLLIN, 0};
      poll(&state, 1, static_cast<int>(left));
    }
  }
}

WorkerLink::Coming WorkerLink::AwaitReady(std::chrono::milliseconds patience) {
  const Coming coming = Await(patience);
  std::string said;
  if (coming != Coming::kWhole) {
    return coming;
  }
  return Recv(said) && said.empty() ? Coming::kWhole : Coming::kGone;
}

}  // namespace QELO
