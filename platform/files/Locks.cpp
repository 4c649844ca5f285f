#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include "platform/base/FileLock.h"
#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Core.h"

extern "C" {

int QLIBCFileLockTimeByFile(const char* path, int type, int seconds, int* fd) {
  constexpr int kExclusive = 1;
  *fd = -1;
  if (type != kExclusive) {
    return -1;
  }
  QELO::UniqueFd file(open(path, O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NOCTTY, 0600));
  if (!file || !QELO::Platform::lockFile(file.Get(), seconds)) {
    return -1;
  }
  *fd = file.Release();
  return 0;
}

int QLIBCFileUnlockByFile(int fd) {
  // A child forked meanwhile shares the lock: closing our descriptor alone would not end it.
  const int unlocked = flock(fd, LOCK_UN);
  return close(fd) == 0 ? unlocked : -1;
}

}  // extern "C"
