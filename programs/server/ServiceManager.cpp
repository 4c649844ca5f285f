#include "programs/server/ServiceManager.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <time.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "webapi/base/Number.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::ServiceManager {
namespace {

constexpr int kFirstSocket = 3;
constexpr int kMostSockets = 64;

int numberOf(const char* variable) {
  const char* text = getenv(variable);
  int number = 0;
  return text != nullptr && ParseNumber(text, number) ? number : 0;
}

}  // namespace

void Tell(const std::string& state) {
  const char* path = getenv("NOTIFY_SOCKET");
  sockaddr_un address{};
  if (path == nullptr || (*path != '/' && *path != '@') ||
      strlen(path) >= sizeof address.sun_path) {
    return;
  }
  address.sun_family = AF_UNIX;
  const size_t length = strlen(path);
  memcpy(address.sun_path, path, length);
  if (*path == '@') {
    address.sun_path[0] = '\0';  // a name outside of the file system
  }
  const UniqueFd sender(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  sendto(sender.Get(), state.data(), state.size(), MSG_NOSIGNAL | MSG_DONTWAIT,
         reinterpret_cast<const sockaddr*>(&address),
         static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + length));
}

void TellReloading() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  Tell("RELOADING=1\nMONOTONIC_USEC=" +
       std::to_string(int64_t{now.tv_sec} * 1000000 + now.tv_nsec / 1000));
}

std::vector<int> TakeSockets() {
  std::vector<int> sockets;
  const int count = numberOf("LISTEN_FDS");
  if (numberOf("LISTEN_PID") == getpid() && count <= kMostSockets) {
    for (int i = 0; i < count; ++i) {
      sockets.push_back(kFirstSocket + i);
    }
  }
  unsetenv("LISTEN_FDS");
  unsetenv("LISTEN_PID");
  unsetenv("LISTEN_FDNAMES");
  return sockets;
}

}  // namespace QELO::ServiceManager
