#include "webapi/base/TextFile.h"

#include <poll.h>

#include <cerrno>

namespace QELO {

int OpenRegularFile(int dir, const char* name, UniqueFd& file, struct stat& info, int link) {
  // Not blocking: the name may turn out to be a pipe.
  UniqueFd opened(openat(dir, name, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY | link));
  if (!opened || fstat(opened.Get(), &info) != 0) {
    return errno;
  }
  if (!S_ISREG(info.st_mode)) {
    return EINVAL;
  }
  file = std::move(opened);
  return 0;
}

bool ReadText(int file, size_t limit, std::string& text) {
  text.clear();
  char buffer[4096];
  while (true) {
    const ssize_t count = TEMP_FAILURE_RETRY(read(file, buffer, sizeof buffer));
    if (count <= 0) {
      return count == 0;
    }
    if (static_cast<size_t>(count) > limit - text.size()) {
      return false;
    }
    text.append(buffer, static_cast<size_t>(count));
  }
}

bool WriteText(int file, std::string_view text) {
  while (!text.empty()) {
    const ssize_t count = TEMP_FAILURE_RETRY(write(file, text.data(), text.size()));
    if (count > 0) {
      text.remove_prefix(static_cast<size_t>(count));
    } else if (count < 0 && errno == EAGAIN) {
      pollfd ready{file, POLLOUT, 0};
      poll(&ready, 1, -1);
    } else {
      return false;
    }
  }
  return true;
}

}  // namespace QELO
