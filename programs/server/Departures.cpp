#include "programs/server/Departures.h"

#include <sys/socket.h>

#include <cerrno>
#include <utility>

namespace QELO {
namespace {

constexpr std::chrono::seconds kLimit{2};  ///< for the other side to take in what it was told
constexpr size_t kDropped = 65536;         ///< bytes that are dropped by one read

}  // namespace

void Departures::Tell(std::unique_ptr<Connection> connection) {
  const std::string& text = connection->answer;
  const int descriptor = connection->socket.Get();
  send(descriptor, text.data(), text.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
  shutdown(descriptor, SHUT_WR);
  if (!text.empty() && connections_.size() < most_ && events_.Watch(descriptor)) {
    connection->deadline = ServerClock::now() + kLimit;
    connections_[descriptor] = std::move(connection);
  }
}

bool Departures::Hear(int descriptor) {
  const auto found = connections_.find(descriptor);
  if (found == connections_.end()) {
    return false;
  }
  char dropped[kDropped];
  const ssize_t count = recv(descriptor, dropped, sizeof dropped, MSG_DONTWAIT);
  if (count == 0 || (count < 0 && errno != EAGAIN && errno != EINTR)) {
    events_.Unwatch(descriptor);
    connections_.erase(found);
  }
  return true;
}

void Departures::Sweep(ServerClock::time_point now) {
  for (auto it = connections_.begin(); it != connections_.end();) {
    if (it->second->deadline > now) {
      ++it;
      continue;
    }
    events_.Unwatch(it->first);
    it = connections_.erase(it);
  }
}

}  // namespace QELO
