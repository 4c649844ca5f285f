#include "webapi/entry/intake/UnreadBody.h"

#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>

namespace QELO {
namespace {

using Clock = std::chrono::steady_clock;

constexpr size_t kChunkSize = 65536;  ///< what a pipe holds

bool hasAWriter(int descriptor) {
  struct stat info {};
  return fstat(descriptor, &info) == 0 && (S_ISFIFO(info.st_mode) || S_ISSOCK(info.st_mode));
}

int64_t announcedLength() {
  const char* length = getenv("CONTENT_LENGTH");
  if (length != nullptr && *length != '\0') {
    return std::max<int64_t>(atoll(length), 0);
  }
  return getenv("HTTP_TRANSFER_ENCODING") != nullptr ? -1 : 0;
}

}  // namespace

UnreadBody::UnreadBody(int descriptor, int64_t length) : descriptor_(descriptor), left_(0) {
  if (length != 0 && hasAWriter(descriptor)) {
    body_ = FileIdentity(descriptor);
    left_ = length < 0 ? kMostDropped : std::min(length, kMostDropped);
  }
}

UnreadBody UnreadBody::OfRequest() {
  return UnreadBody(STDIN_FILENO, announcedLength());
}

void UnreadBody::DropSome() {
  char chunk[kChunkSize];
  const size_t size = static_cast<size_t>(std::min<int64_t>(Left(), sizeof chunk));
  const ssize_t count = TEMP_FAILURE_RETRY(read(descriptor_, chunk, size));
  if (count > 0) {
    left_ -= count;
  } else if (count == 0 || errno != EAGAIN) {
    left_ = 0;
  }
}

void UnreadBody::Drop() {
  const Clock::time_point end = Clock::now() + kTimeLimit;
  while (IsOpen() && Clock::now() < end) {
    pollfd input{descriptor_, POLLIN, 0};
    if (TEMP_FAILURE_RETRY(poll(&input, 1, static_cast<int>(kIdleLimit.count()))) <= 0) {
      return;
    }
    DropSome();
  }
}

}  // namespace QELO
