#include "webapi/base/ReplaceFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>

namespace QELO::JsonHelper {
namespace {

/// A new file of this name. One that a killed process left is removed; nothing is followed.
int createFresh(const std::string& path) {
  const int flags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  const int fd = open(path.c_str(), flags, 0600);
  if (fd >= 0 || errno != EEXIST || unlink(path.c_str()) != 0) {
    return fd;
  }
  return open(path.c_str(), flags, 0600);
}

bool writeAll(int fd, const std::string& text) {
  size_t done = 0;
  while (done < text.size()) {
    const ssize_t count = TEMP_FAILURE_RETRY(write(fd, text.data() + done, text.size() - done));
    if (count <= 0) {
      return false;
    }
    done += static_cast<size_t>(count);
  }
  return true;
}

}  // namespace

bool replaceText(const std::string& path, const std::string& text, bool isLocked) {
  struct stat old {};
  const mode_t mode = stat(path.c_str(), &old) == 0 ? old.st_mode & 07777 : 0600;
  std::string fresh = path + (isLocked ? ".new" : ".XXXXXX");
  const int fd = isLocked ? createFresh(fresh) : mkostemp(fresh.data(), O_CLOEXEC);
  if (fd < 0) {
    return false;
  }
  const bool written = writeAll(fd, text) && fchmod(fd, mode) == 0;
  if (close(fd) != 0 || !written || rename(fresh.c_str(), path.c_str()) != 0) {
    unlink(fresh.c_str());
    return false;
  }
  return true;
}

}  // namespace QELO::JsonHelper
