#include <arpa/inet.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <string_view>
#include <utility>

#include "webapi/platform/Daemon.h"

namespace qelodaemon {
namespace {

using Clock = std::chrono::steady_clock;

constexpr size_t kPiece = size_t{1} << 20;  ///< bytes that are made room for at once

/// Waits until the socket can do something.
/// @return false, with errno, past the time
bool await(int descriptor, short event, Clock::time_point end) {
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - Clock::now()).count();
  pollfd ready{descriptor, event, 0};
  const int count =
      TEMP_FAILURE_RETRY(poll(&ready, 1, static_cast<int>(std::max<decltype(left)>(left, 0))));
  if (count == 0) {
    errno = ETIMEDOUT;
  }
  return count > 0;
}

bool sendAll(int descriptor, std::string_view text, Clock::time_point end) {
  while (!text.empty()) {
    const ssize_t count =
        TEMP_FAILURE_RETRY(send(descriptor, text.data(), text.size(), MSG_NOSIGNAL | MSG_DONTWAIT));
    if (count >= 0) {
      text.remove_prefix(static_cast<size_t>(count));
    } else if (errno != EAGAIN || !await(descriptor, POLLOUT, end)) {
      return false;
    }
  }
  return true;
}

/// Fills `size` bytes at `text`.
bool receiveAll(int descriptor, char* text, size_t size, Clock::time_point end) {
  while (size > 0) {
    const ssize_t count = TEMP_FAILURE_RETRY(recv(descriptor, text, size, MSG_DONTWAIT));
    if (count == 0) {
      errno = EPIPE;
      return false;
    }
    if (count > 0) {
      text += count;
      size -= static_cast<size_t>(count);
    } else if (errno != EAGAIN || !await(descriptor, POLLIN, end)) {
      return false;
    }
  }
  return true;
}

}  // namespace

SockConnection::SockConnection(int descriptor, const Limits& limits)
    : descriptor_(descriptor), limits_(limits) {}

SockConnection::~SockConnection() {
  if (descriptor_ != -1) {
    close(descriptor_);
  }
}

bool SockConnection::Send(const std::string& message) {
  if (message.size() > kLargestMessage) {
    errno = EMSGSIZE;
    return false;
  }
  const Clock::time_point end = Clock::now() + limits_.send;
  const uint32_t length = htonl(static_cast<uint32_t>(message.size()));
  char head[sizeof length];
  memcpy(head, &length, sizeof length);
  // At once, so that the other side is woken once alone.
  iovec parts[] = {{head, sizeof head}, {const_cast<char*>(message.data()), message.size()}};
  msghdr whole{};
  whole.msg_iov = parts;
  whole.msg_iovlen = message.empty() ? 1 : 2;
  const ssize_t count =
      TEMP_FAILURE_RETRY(sendmsg(descriptor_, &whole, MSG_NOSIGNAL | MSG_DONTWAIT));
  if (count < 0 && errno != EAGAIN) {
    return false;
  }
  const size_t sent = static_cast<size_t>(std::max<ssize_t>(count, 0));
  const size_t ofHead = std::min(sent, sizeof head);
  return sendAll(descriptor_, std::string_view(head, sizeof head).substr(ofHead), end) &&
         sendAll(descriptor_, std::string_view(message).substr(sent - ofHead), end);
}

bool SockConnection::Recv(std::string& message) {
  const Clock::time_point end = Clock::now() + limits_.receive;
  char head[sizeof(uint32_t)];
  if (!receiveAll(descriptor_, head, sizeof head, end)) {
    return false;
  }
  uint32_t announced = 0;
  memcpy(&announced, head, sizeof announced);
  const size_t length = ntohl(announced);
  if (length > kLargestMessage) {
    errno = EMSGSIZE;
    return false;
  }
  std::string received;
  while (received.size() < length) {
    const size_t before = received.size();
    received.resize(std::min(length, before + kPiece));
    if (!receiveAll(descriptor_, received.data() + before, received.size() - before, end)) {
      return false;
    }
  }
  message = std::move(received);
  return true;
}

}  // namespace qelodaemon
