#include "paths/Folder.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>

#include <cerrno>
#include <cstdio>

namespace files {
namespace {

constexpr unsigned kBeneath =
    RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS | RESOLVE_NO_XDEV;
constexpr int kTries = 8;  ///< while others move folders about

/// @return the descriptor, or -1 with errno
int openBelow(int folder, const char* path, int flags, unsigned resolve) {
  struct open_how how {};
  how.flags = static_cast<unsigned>(flags | O_CLOEXEC);
  how.resolve = resolve;
  int opened = -1;
  for (int i = 0; i < kTries; ++i) {
    opened = static_cast<int>(syscall(SYS_openat2, folder, path, &how, sizeof how));
    if (opened >= 0 || (errno != EAGAIN && errno != EINTR)) {
      break;
    }
  }
  return opened;
}

/// Where the process finds the open file itself, by no name that another could change.
class OwnPath {
 public:
  explicit OwnPath(int fd) { std::snprintf(text_, sizeof text_, "/proc/self/fd/%d", fd); }
  const char* Get() const { return text_; }

 private:
  char text_[32];
};

}  // namespace

Reason Folder::OpenShare(const Share& share, Folder& folder) {
  Descriptor opened(openBelow(AT_FDCWD, share.path.c_str(), O_PATH | O_DIRECTORY,
                              RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS));
  if (!opened) {
    return errno == EACCES ? Reason::kDenied : Reason::kShareBroken;
  }
  folder.folder_ = std::move(opened);
  return Reason::kNone;
}

Reason Folder::Enter(const std::string& below, Folder& folder) const {
  Descriptor opened(openBelow(Get(), below.c_str(), O_PATH | O_DIRECTORY, kBeneath));
  if (!opened) {
    return reasonOf(errno);
  }
  folder.folder_ = std::move(opened);
  return Reason::kNone;
}

Reason Folder::OpenForReading(Descriptor& descriptor) const {
  Descriptor opened(openBelow(Get(), ".", O_RDONLY | O_DIRECTORY, kBeneath));
  if (!opened) {
    return reasonOf(errno);
  }
  descriptor = std::move(opened);
  return Reason::kNone;
}

Reason Folder::Look(const std::string& name, Item& item) const {
  return reasonOf(lookAt(Get(), name, item));
}

Reason Folder::LookAtItself(Item& item) const {
  return reasonOf(lookAt(Get(), "", item));
}

Reason Folder::OpenFile(const std::string& name, Descriptor& file, Item& item) const {
  const Descriptor found(openBelow(Get(), name.c_str(), O_PATH | O_NOFOLLOW, kBeneath));
  Item seen;
  if (!found) {
    return reasonOf(errno);
  }
  if (const int error = lookAt(found.Get(), "", seen); error != 0) {
    return reasonOf(error);
  }
  if (!seen.IsFile()) {
    return seen.IsFolder()                ? Reason::kNotAFile
           : seen.type == ItemType::kLink ? Reason::kLink
                                          : Reason::kSpecial;
  }
  // The very file that was looked at.
  Descriptor opened(
      TEMP_FAILURE_RETRY(open(OwnPath(found.Get()).Get(), O_RDONLY | O_NOCTTY | O_CLOEXEC)));
  if (!opened) {
    return reasonOf(errno);
  }
  seen.name = name;
  file = std::move(opened);
  item = seen;
  return Reason::kNone;
}

Reason Folder::MakeFolder(const std::string& name, unsigned mode) const {
  return mkdirat(Get(), name.c_str(), mode) == 0 ? Reason::kNone : reasonOf(errno);
}

Reason Folder::Move(const std::string& name, const Folder& to, const std::string& newName) const {
  return renameat2(Get(), name.c_str(), to.Get(), newName.c_str(), RENAME_NOREPLACE) == 0
             ? Reason::kNone
             : reasonOf(errno);
}

Reason Folder::Replace(const std::string& name, const Folder& to,
                       const std::string& newName) const {
  return renameat(Get(), name.c_str(), to.Get(), newName.c_str()) == 0 ? Reason::kNone
                                                                       : reasonOf(errno);
}

Reason Folder::RemoveFolder(const std::string& name) const {
  return unlinkat(Get(), name.c_str(), AT_REMOVEDIR) == 0 ? Reason::kNone : reasonOf(errno);
}

Reason Folder::RemoveFile(const std::string& name) const {
  return unlinkat(Get(), name.c_str(), 0) == 0 ? Reason::kNone : reasonOf(errno);
}

}  // namespace files
