#include "programs/webapi-server/workers/ControlChannel.h"

#include <sys/socket.h>
#include <sys/uio.h>

#include <cerrno>
#include <cstring>

namespace QELO::ControlChannel {

bool Make(UniqueFd& first, UniqueFd& second) {
  int ends[2];
  if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0) {
    return false;
  }
  first = UniqueFd(ends[0]);
  second = UniqueFd(ends[1]);
  return true;
}

bool Send(int channel, char kind, std::string_view text, int descriptor, bool waits) {
  iovec parts[] = {{&kind, 1}, {const_cast<char*>(text.data()), text.size()}};
  alignas(cmsghdr) char room[CMSG_SPACE(sizeof(int))] = {};
  msghdr message{};
  message.msg_iov = parts;
  message.msg_iovlen = text.empty() ? 1 : 2;
  if (descriptor >= 0) {
    message.msg_control = room;
    message.msg_controllen = sizeof room;
    cmsghdr* along = CMSG_FIRSTHDR(&message);
    along->cmsg_level = SOL_SOCKET;
    along->cmsg_type = SCM_RIGHTS;
    along->cmsg_len = CMSG_LEN(sizeof descriptor);
    memcpy(CMSG_DATA(along), &descriptor, sizeof descriptor);
  }
  return TEMP_FAILURE_RETRY(
             sendmsg(channel, &message, MSG_NOSIGNAL | (waits ? 0 : MSG_DONTWAIT))) >= 0;
}

bool Receive(int channel, Message& received, bool waits) {
  received.text.resize(kLongest);
  iovec parts[] = {{&received.kind, 1}, {received.text.data(), received.text.size()}};
  alignas(cmsghdr) char room[CMSG_SPACE(sizeof(int))] = {};
  msghdr message{};
  message.msg_iov = parts;
  message.msg_iovlen = 2;
  message.msg_control = room;
  message.msg_controllen = sizeof room;
  errno = 0;
  const ssize_t count =
      TEMP_FAILURE_RETRY(recvmsg(channel, &message, MSG_CMSG_CLOEXEC | (waits ? 0 : MSG_DONTWAIT)));
  for (cmsghdr* along = CMSG_FIRSTHDR(&message); count > 0 && along != nullptr;
       along = CMSG_NXTHDR(&message, along)) {
    if (along->cmsg_level == SOL_SOCKET && along->cmsg_type == SCM_RIGHTS) {
      int descriptor = -1;
      memcpy(&descriptor, CMSG_DATA(along), sizeof descriptor);
      received.descriptor = UniqueFd(descriptor);
    }
  }
  received.text.resize(count > 0 ? static_cast<size_t>(count) - 1 : 0);
  return count > 0;
}

}  // namespace QELO::ControlChannel
