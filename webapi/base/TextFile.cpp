#include "webapi/base/TextFile.h"

#include <fcntl.h>

#include <cerrno>

namespace QELO::Platform {

int openRegularFile(int dir, const char* name, UniqueFd& file, struct stat& info) {
  // Not blocking: the name may turn out to be a pipe.
  UniqueFd opened(openat(dir, name, O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY));
  if (!opened || fstat(opened.Get(), &info) != 0) {
    return errno;
  }
  if (!S_ISREG(info.st_mode)) {
    return EINVAL;
  }
  file = std::move(opened);
  return 0;
}

bool readText(int file, size_t limit, std::string& text) {
  text.clear();
  char buffer[4096];
  while (true) {
    const ssize_t count = TEMP_FAILURE_RETRY(read(file, buffer, sizeof buffer));
    if (count <= 0) {
      return count == 0;
    }
    if (text.size() + static_cast<size_t>(count) > limit) {
      return false;
    }
    text.append(buffer, static_cast<size_t>(count));
  }
}

bool writeText(int file, const std::string& text) {
  size_t done = 0;
  while (done < text.size()) {
    const ssize_t count = TEMP_FAILURE_RETRY(write(file, text.data() + done, text.size() - done));
    if (count <= 0) {
      return false;
    }
    done += static_cast<size_t>(count);
  }
  return true;
}

}  // namespace QELO::Platform
