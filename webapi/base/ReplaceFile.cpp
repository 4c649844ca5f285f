#include "webapi/base/ReplaceFile.h"

#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "webapi/base/Hex.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

/// A name that nobody else has.
std::string ownSuffix() {
  char bytes[8] = {};
  return getrandom(bytes, sizeof bytes, 0) == sizeof bytes ? "." + HexText({bytes, sizeof bytes})
                                                           : "." + std::to_string(getpid());
}

/// A new file of this name. One that a killed process left is removed; nothing is followed.
UniqueFd createFresh(int directory, const char* path) {
  const int flags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  UniqueFd file(openat(directory, path, flags, 0600));
  if (!file && errno == EEXIST && unlinkat(directory, path, 0) == 0) {
    file = UniqueFd(openat(directory, path, flags, 0600));
  }
  return file;
}

bool write(int file, std::string_view text, const struct stat& status, const Replacement& how) {
  return (!how.keepsOwner || fchown(file, status.st_uid, status.st_gid) == 0) &&
         fchmod(file, status.st_mode & 07777) == 0 && WriteText(file, text) &&
         (!how.isSynced || fsync(file) == 0);
}

}  // namespace

bool ReplaceFile(const std::string& path, std::string_view text, const Replacement& how) {
  struct stat status {};
  if (fstatat(how.directory, path.c_str(), &status, 0) != 0) {
    status.st_mode = how.mode;
    status.st_uid = geteuid();
    status.st_gid = getegid();
  }
  std::string fresh = path;
  fresh += how.freshSuffix.empty() ? ownSuffix() : how.freshSuffix;
  UniqueFd file = createFresh(how.directory, fresh.c_str());
  if (!file) {
    return false;
  }
  const bool written = write(file.Get(), text, status, how);
  if (!written || close(file.Release()) != 0 ||
      renameat(how.directory, fresh.c_str(), how.directory, path.c_str()) != 0) {
    const int error = errno;
    unlinkat(how.directory, fresh.c_str(), 0);
    errno = error;
    return false;
  }
  return true;
}

}  // namespace QELO
