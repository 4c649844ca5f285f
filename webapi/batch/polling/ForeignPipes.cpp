#include "webapi/batch/polling/ForeignPipes.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

constexpr char kDescriptors[] = "/proc/self/fd";
constexpr char kNull[] = "/dev/null";

struct PipeEnd {
  int descriptor = -1;
  int access = O_RDONLY;
  dev_t device = 0;
  ino_t inode = 0;
};

std::vector<int> listDescriptors() {
  std::vector<int> descriptors;
  DIR* directory = opendir(kDescriptors);
  while (const dirent* entry = directory != nullptr ? readdir(directory) : nullptr) {
    const int descriptor = atoi(entry->d_name);
    if (entry->d_name[0] != '.' && descriptor > STDERR_FILENO && descriptor != dirfd(directory)) {
      descriptors.push_back(descriptor);
    }
  }
  if (directory != nullptr) {
    closedir(directory);
  }
  return descriptors;
}

/// Puts /dev/null over the descriptor. It must not become free: a stream may hold the number still,
/// and would write into what is opened next, the task's own record for one.
void mute(int descriptor, const UniqueFd& null) {
  const int flags = fcntl(descriptor, F_GETFD);
  dup3(null.Get(), descriptor, flags >= 0 && (flags & FD_CLOEXEC) == 0 ? 0 : O_CLOEXEC);
}

/// Whether it is a pipe without a name: one that has a name is opened by whoever knows it.
bool isPipe(int descriptor) {
  char link[64];
  const std::string file = std::string(kDescriptors) + "/" + std::to_string(descriptor);
  const ssize_t length = readlink(file.c_str(), link, sizeof link);
  return length > 5 && memcmp(link, "pipe:", 5) == 0;
}

bool hasName(int descriptor, int (*ask)(int, sockaddr*, socklen_t*)) {
  sockaddr_un address{};
  socklen_t length = sizeof address;
  // Nameless ones answer with the family alone.
  return ask(descriptor, reinterpret_cast<sockaddr*>(&address), &length) != 0 ||
         address.sun_family != AF_UNIX || length > sizeof address.sun_family;
}

bool isSocketPairOfAnother(int descriptor, pid_t starter) {
  ucred maker{};
  socklen_t length = sizeof maker;
  return !hasName(descriptor, getsockname) && !hasName(descriptor, getpeername) &&
         getsockopt(descriptor, SOL_SOCKET, SO_PEERCRED, &maker, &length) == 0 && maker.pid > 0 &&
         maker.pid != starter && maker.pid != getpid();
}

void muteOrphans(const std::vector<PipeEnd>& ends, const UniqueFd& null) {
  for (const PipeEnd& end : ends) {
    const bool canRead = std::any_of(ends.begin(), ends.end(), [&](const PipeEnd& other) {
      return other.access != O_WRONLY && other.device == end.device && other.inode == end.inode;
    });
    if (!canRead) {
      mute(end.descriptor, null);
    }
  }
}

}  // namespace

void mutePipesToOthers(pid_t starter) noexcept {
  std::vector<PipeEnd> ends;
  const std::vector<int> descriptors = listDescriptors();
  const UniqueFd null(open(kNull, O_RDWR | O_CLOEXEC));
  if (!null) {
    return;  // who waits for a pipe's end waits longer; a record that is written over is lost
  }
  for (const int descriptor : descriptors) {
    struct stat info {};
    if (fstat(descriptor, &info) != 0) {
      continue;
    }
    if (S_ISFIFO(info.st_mode) && isPipe(descriptor)) {
      ends.push_back(
          {descriptor, fcntl(descriptor, F_GETFL) & O_ACCMODE, info.st_dev, info.st_ino});
    } else if (S_ISSOCK(info.st_mode) && isSocketPairOfAnother(descriptor, starter)) {
      mute(descriptor, null);
    }
  }
  muteOrphans(ends, null);
}

}  // namespace QELO
