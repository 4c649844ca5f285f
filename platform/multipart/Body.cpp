#include "platform/multipart/Body.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "webapi/base/TakenBody.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

constexpr uint64_t kUsualRoom = 64 << 10;  ///< bytes that a pipe holds
/// Bytes that one may hold: what is read at once, which saves the server and this process three of
/// four turns.
constexpr int kPipeRoom = 256 << 10;

bool hasAWriter(int descriptor) {
  struct stat info {};
  return fstat(descriptor, &info) != 0 || !S_ISREG(info.st_mode);
}

}  // namespace

Body::Body(int descriptor, uint64_t length, const PaceLimits& limits)
    : descriptor_(descriptor),
      length_(length),
      left_(length),
      pace_(limits),
      mayBlock_(hasAWriter(descriptor)) {
  if (length > kUsualRoom) {
    fcntl(descriptor, F_SETPIPE_SZ, kPipeRoom);  // not where it is no pipe, or there is no room
  }
}

int64_t Body::Read(char* buffer, size_t size) {
  const size_t wanted = static_cast<size_t>(std::min<uint64_t>(size, left_));
  while (wanted > 0) {
    if (mayBlock_ && pace_.Await(descriptor_, POLLIN) <= 0) {
      return QELO_UPLOAD_BROKEN_OFF;
    }
    const ssize_t count = TEMP_FAILURE_RETRY(read(descriptor_, buffer, wanted));
    if (count > 0) {
      left_ -= static_cast<uint64_t>(count);
      pace_.Add(static_cast<uint64_t>(count));
      TakenBodyBytes() += descriptor_ == STDIN_FILENO ? count : 0;
      return count;
    }
    if (count == 0 || errno != EAGAIN) {
      return QELO_UPLOAD_BROKEN_OFF;
    }
  }
  return 0;
}

}  // namespace QELO::Platform
