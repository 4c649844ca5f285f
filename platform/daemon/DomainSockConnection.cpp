#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>

#include "webapi/platform/Daemon.h"

namespace qelodaemon {
namespace {

/// For connect() too, which waits for room in the listener's queue.
bool setLimit(int descriptor, std::chrono::milliseconds limit) {
  timeval time{};
  time.tv_sec = static_cast<time_t>(limit.count() / 1000);
  time.tv_usec = static_cast<suseconds_t>(limit.count() % 1000 * 1000);
  return setsockopt(descriptor, SOL_SOCKET, SO_SNDTIMEO, &time, sizeof time) == 0;
}

}  // namespace

DomainSockConnection::DomainSockConnection(const std::string& path, const Limits& limits)
    : SockConnection(-1, limits), path_(path) {}

DomainSockConnection::~DomainSockConnection() = default;

bool DomainSockConnection::Connect() {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (path_.empty() || path_.size() >= sizeof address.sun_path ||
      path_.find('\0') != std::string::npos) {
    errno = ENAMETOOLONG;
    return false;
  }
  memcpy(address.sun_path, path_.data(), path_.size());
  if (descriptor_ == -1) {
    descriptor_ = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  }
  return descriptor_ != -1 && setLimit(descriptor_, limits_.connect) &&
         TEMP_FAILURE_RETRY(connect(descriptor_, reinterpret_cast<const sockaddr*>(&address),
                                    sizeof address)) == 0;
}

}  // namespace qelodaemon
