#include "transfer/Placing.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "work/FileCopy.h"
#include "work/Report.h"

namespace files {
namespace {

constexpr mode_t kMode = 0666;  ///< before the process's mask
constexpr char kDefaultAccess[] = "system.posix_acl_default";

mode_t processMask() {
  const mode_t mask = umask(0);
  umask(mask);
  return mask;
}

/// Whether what is made in a folder gets more from it than a group.
bool handsDownAccess(const Folder& folder) {
  char path[32];
  std::snprintf(path, sizeof path, "/proc/self/fd/%d", folder.Get());
  return getxattr(path, kDefaultAccess, nullptr, 0) > 0;
}

/// What a file that is made in the folder would have. @return whether it has
bool fit(int file, const Folder& folder) {
  struct stat info {};
  if (handsDownAccess(folder) || fstat(folder.Get(), &info) != 0 ||
      fchmod(file, kMode & ~processMask()) != 0) {
    return false;
  }
  return (info.st_mode & S_ISGID) == 0 || fchown(file, static_cast<uid_t>(-1), info.st_gid) == 0;
}

Reason copyInto(int file, const Folder& folder, const std::string& name, Existing existing,
                bool& isSkipped) {
  struct stat info {};
  NewFile copy;
  Report report("copying");
  Reason reason = fstat(file, &info) == 0 ? copy.Make(folder) : reasonOf(errno);
  if (reason == Reason::kNone) {
    reason = copyContent(file, copy.Get(), static_cast<uint64_t>(info.st_size), report);
  }
  return reason == Reason::kNone ? copy.Finish(name, existing, isSkipped) : reason;
}

}  // namespace

Reason placeFile(const std::string& temporary, const Folder& folder, const std::string& name,
                 Existing existing, bool& isSkipped) {
  const Descriptor file(open(temporary.c_str(), O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (!file) {
    return reasonOf(errno);
  }
  if (!fit(file.Get(), folder)) {
    return copyInto(file.Get(), folder, name, existing, isSkipped);
  }
  const unsigned flags = existing == Existing::kReplace ? 0 : RENAME_NOREPLACE;
  if (renameat2(AT_FDCWD, temporary.c_str(), folder.Get(), name.c_str(), flags) == 0) {
    return Reason::kNone;
  }
  if (errno == EXDEV) {
    return copyInto(file.Get(), folder, name, existing, isSkipped);
  }
  isSkipped = errno == EEXIST && existing == Existing::kSkip;
  return isSkipped ? Reason::kNone : reasonOf(errno);
}

}  // namespace files
