#include "programs/webapi-server/RequestInput.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>

#include "webapi/base/NullDevice.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

constexpr int64_t kPipeRoom = 64 << 10;         ///< bytes that a pipe holds
constexpr std::chrono::seconds kIdleLimit{30};  ///< without a byte; the library's own limit

/// Passes the body on. A client that is too slow, or gone, ends it early, as it does for a CGI
/// program.
void passOn(int connection, int64_t length, int pipe) {
  char piece[kPipeRoom];
  int64_t passed = 0;
  while (passed < length) {
    pollfd ends[] = {{connection, POLLIN, 0}, {pipe, 0, 0}};
    const std::chrono::milliseconds limit = kIdleLimit;
    if (TEMP_FAILURE_RETRY(poll(ends, 2, static_cast<int>(limit.count()))) <= 0 ||
        (ends[1].revents & POLLERR) != 0) {
      break;
    }
    const size_t wanted = static_cast<size_t>(std::min(length - passed, kPipeRoom));
    const ssize_t count = TEMP_FAILURE_RETRY(recv(connection, piece, wanted, 0));
    if (count <= 0 || !WriteText(pipe, {piece, static_cast<size_t>(count)})) {
      break;
    }
    passed += count;
  }
}

/// Not a child of the caller's, which may wait for children of its own.
bool passOnInBackground(int connection, int64_t length, UniqueFd& writing, int reading) {
  const pid_t first = fork();
  if (first == 0) {
    if (fork() == 0) {
      close(reading);
      LetGoOf({STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO});
      passOn(connection, length, writing.Get());
    }
    _exit(0);
  }
  return first > 0 && TEMP_FAILURE_RETRY(waitpid(first, nullptr, 0)) == first;
}

}  // namespace

bool PutBodyOnInput(int connection, int64_t length) {
  int ends[2];
  if (length == 0) {
    return true;
  }
  if (pipe2(ends, O_CLOEXEC) != 0) {
    return false;
  }
  const UniqueFd reading(ends[0]);
  UniqueFd writing(ends[1]);
  if (length <= kPipeRoom) {
    passOn(connection, length, writing.Get());
  } else if (!passOnInBackground(connection, length, writing, reading.Get())) {
    return false;
  }
  return dup2(reading.Get(), STDIN_FILENO) == STDIN_FILENO;
}

}  // namespace QELO
