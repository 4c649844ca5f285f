#include "webapi/entry/output/WriteAnswer.h"

#include <limits.h>
#include <poll.h>
#include <stdio_ext.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include "webapi/base/Log.h"
#include "webapi/entry/intake/UnreadBody.h"

namespace QELO {
namespace {

/// Waits until standard output takes more, and drops what comes of the body meanwhile.
/// @return how many bytes it takes at least without waiting; 0: perhaps none
size_t waitForRoom(UnreadBody& body) {
  pollfd ready[] = {{STDOUT_FILENO, POLLOUT, 0}, {body.Descriptor(), POLLIN, 0}};
  poll(ready, body.IsOpen() ? 2 : 1, -1);
  if (ready[1].revents != 0) {
    body.DropSome();
  }
  return ready[0].revents != 0 ? PIPE_BUF : 0;
}

}  // namespace

bool WriteAnswer(std::string_view text, UnreadBody& body) {
  if (fflush(stdout) != 0) {
    __fpurge(stdout);  // the client is gone, and no later flush must try again
  }
  while (!text.empty()) {
    const size_t room = body.IsOpen() ? std::min(waitForRoom(body), text.size()) : text.size();
    if (room == 0) {
      continue;
    }
    const ssize_t count = write(STDOUT_FILENO, text.data(), room);
    if (count >= 0) {
      text.remove_prefix(static_cast<size_t>(count));
    } else if (errno == EAGAIN) {
      waitForRoom(body);
    } else if (errno != EINTR) {
      if (errno != EPIPE) {
        WEBAPI_LOG("WebEntry.cpp", "cannot write the answer [%m]");
      }
      return false;
    }
  }
  return true;
}

bool WriteAnswer(std::string_view text) {
  UnreadBody none(STDIN_FILENO, 0);
  return WriteAnswer(text, none);
}

}  // namespace QELO
