#include "platform/fileoutput/Writer.h"

#include <fcntl.h>
#include <poll.h>
#include <stdio_ext.h>
#include <sys/sendfile.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

#include "webapi/base/Log.h"
#include "webapi/base/TextFile.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "FileOutputer.cpp";
constexpr size_t kChunk = 65536;  ///< bytes that go through the process at once
/// Bytes that a pipe to the web server may hold: each time it is full or empty the two wait for
/// each other. All pipes of a user have 64 MiB before the kernel makes new ones small.
constexpr int kPipeRoom = 262144;
constexpr size_t kMostAtOnce = 1U << 30U;  ///< bytes of one call that send within the kernel

/// @return false
bool failed() {
  if (errno != EPIPE && errno != ECONNRESET) {
    WEBAPI_LOG(kSource, "the answer broke off [%m]");
  }
  return false;
}

bool endedEarly() {
  WEBAPI_LOG(kSource, "the answer broke off: the file or stream has become shorter");
  return false;
}

}  // namespace

Writer::Writer() {
  if (fflush(stdout) != 0) {
    __fpurge(stdout);  // the client is gone, and no later flush must try again
  }
}

bool Writer::WriteText(std::string_view text) {
  return QELO::WriteText(STDOUT_FILENO, text) || failed();
}

bool Writer::SendFile(int file, off_t start, off_t length) {
  if (length > kPipeRoom) {
    fcntl(STDOUT_FILENO, F_SETPIPE_SZ, kPipeRoom);  // not where it is no pipe, or there is no room
  }
  off_t position = start;
  const off_t end = start + length;
  while (position < end) {
    const size_t wanted = static_cast<size_t>(std::min<off_t>(end - position, kMostAtOnce));
    const ssize_t count = TEMP_FAILURE_RETRY(sendfile(STDOUT_FILENO, file, &position, wanted));
    if (count == 0) {
      return endedEarly();
    }
    if (count < 0 && errno == EAGAIN) {
      pollfd room{STDOUT_FILENO, POLLOUT, 0};
      poll(&room, 1, -1);
    } else if (count < 0 && (errno == EINVAL || errno == ENOSYS)) {
      return CopyFile(file, position, end - position);  // not for this file system or output
    } else if (count < 0) {
      return failed();
    }
  }
  return true;
}

bool Writer::CopyFile(int file, off_t start, off_t length) {
  std::array<char, kChunk> chunk;  // no memory is no reason to break off half-way
  while (length > 0) {
    const size_t wanted = static_cast<size_t>(std::min<off_t>(length, kChunk));
    const ssize_t count = TEMP_FAILURE_RETRY(pread(file, chunk.data(), wanted, start));
    if (count <= 0) {
      return count == 0 ? endedEarly() : failed();
    }
    if (!WriteText({chunk.data(), static_cast<size_t>(count)})) {
      return false;
    }
    start += count;
    length -= count;
  }
  return true;
}

bool Writer::SendStream(std::FILE* stream, off_t length) {
  std::array<char, kChunk> chunk;  // no memory is no reason to break off half-way
  while (length != 0) {
    const size_t wanted =
        length < 0 ? kChunk : static_cast<size_t>(std::min<off_t>(length, kChunk));
    const size_t count = fread(chunk.data(), 1, wanted, stream);
    if (count > 0 && !WriteText({chunk.data(), count})) {
      return false;
    }
    length -= length < 0 ? 0 : static_cast<off_t>(count);
    if (count < wanted && ferror(stream) != 0) {
      return failed();
    }
    if (count < wanted) {
      return length <= 0 || endedEarly();
    }
  }
  return true;
}

}  // namespace QELO::Platform
