#include "platform/fileoutput/Writer.h"

#include <fcntl.h>
#include <poll.h>
#include <stdio_ext.h>
#include <sys/sendfile.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

#include "platform/settings/Settings.h"
#include "webapi/base/Log.h"

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

/// Has writing to standard output fail where it would wait. @return the flags that it had; -1 when
/// nothing was changed
int endWaiting() {
  struct stat info {};
  const bool hasAReader =
      fstat(STDOUT_FILENO, &info) == 0 && (S_ISFIFO(info.st_mode) || S_ISSOCK(info.st_mode));
  const int flags = hasAReader ? fcntl(STDOUT_FILENO, F_GETFL) : -1;
  const bool isChanged = flags >= 0 && (flags & O_NONBLOCK) == 0 &&
                         fcntl(STDOUT_FILENO, F_SETFL, flags | O_NONBLOCK) == 0;
  return isChanged ? flags : -1;
}

}  // namespace

Writer::Writer() : flags_(-1), pace_(Settings().DownloadPace()) {
  if (fflush(stdout) != 0) {
    __fpurge(stdout);  // the client is gone, and no later flush must try again
  }
  flags_ = endWaiting();
}

Writer::~Writer() {
  if (flags_ >= 0) {
    fcntl(STDOUT_FILENO, F_SETFL, flags_);
  }
}

bool Writer::AwaitRoom() {
  const int ready = pace_.Await(STDOUT_FILENO, POLLOUT);
  if (ready == 0) {
    WEBAPI_LOG(kSource, "the answer broke off: the client takes it too slowly");
  }
  return ready > 0 || (ready < 0 && failed());
}

bool Writer::WriteText(std::string_view text) {
  while (!text.empty()) {
    const ssize_t count = TEMP_FAILURE_RETRY(write(STDOUT_FILENO, text.data(), text.size()));
    if (count > 0) {
      text.remove_prefix(static_cast<size_t>(count));
      pace_.Add(static_cast<uint64_t>(count));
    } else if (count == 0 || errno != EAGAIN) {
      return failed();
    } else if (!AwaitRoom()) {
      return false;
    }
  }
  return true;
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
    if (count > 0) {
      pace_.Add(static_cast<uint64_t>(count));
    } else if (errno == EAGAIN) {
      if (!AwaitRoom()) {
        return false;
      }
    } else if (errno == EINVAL || errno == ENOSYS) {
      return CopyFile(file, position, end - position);  // not for this file system or output
    } else {
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
