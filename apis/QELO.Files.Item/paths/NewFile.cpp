#include "paths/NewFile.h"

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "paths/VirtualPath.h"

namespace files {
namespace {

constexpr mode_t kMode = 0666;         ///< before the process's mask
constexpr mode_t kPrivateMode = 0600;  ///< while it has a name and is not whole

mode_t processMask() {
  const mode_t mask = umask(0);
  umask(mask);
  return mask;
}

/// Gives a file without a name its first one. @return 0 or errno
int link(int file, int folder, const std::string& name) {
  char path[32];
  std::snprintf(path, sizeof path, "/proc/self/fd/%d", file);
  return linkat(AT_FDCWD, path, folder, name.c_str(), AT_SYMLINK_FOLLOW) == 0 ? 0 : errno;
}

}  // namespace

std::string temporaryName() {
  unsigned char bytes[16] = {};
  [[maybe_unused]] const ssize_t count = getrandom(bytes, sizeof bytes, 0);  // never short
  std::string name = kTemporaryPrefix;
  for (const unsigned char byte : bytes) {
    constexpr char kDigits[] = "0123456789abcdef";
    name += kDigits[byte >> 4];
    name += kDigits[byte & 15];
  }
  return name;
}

NewFile::~NewFile() {
  if (!temporaryName_.empty()) {
    folder_->RemoveFile(temporaryName_);
  }
}

Reason NewFile::Make(const Folder& folder) {
  folder_ = &folder;
  file_ = Descriptor(openat(folder.Get(), ".", O_TMPFILE | O_RDWR | O_CLOEXEC, kMode));
  if (file_ || (errno != EOPNOTSUPP && errno != EISDIR && errno != EINVAL)) {
    return file_ ? Reason::kNone : reasonOf(errno);
  }
  std::string name = temporaryName();
  file_ = Descriptor(openat(folder.Get(), name.c_str(),
                            O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, kPrivateMode));
  if (!file_) {
    return reasonOf(errno);
  }
  temporaryName_ = std::move(name);
  return fchmod(Get(), kMode & ~processMask()) == 0 ? Reason::kNone : reasonOf(errno);
}

Reason NewFile::Finish(const std::string& name, Existing existing, bool& isSkipped) {
  Reason reason = Reason::kNone;
  if (temporaryName_.empty()) {
    reason = reasonOf(link(Get(), folder_->Get(), name));
  } else {
    reason = folder_->Move(temporaryName_, *folder_, name);
    if (reason == Reason::kNone) {
      temporaryName_.clear();
    }
  }
  if (reason != Reason::kExists || existing == Existing::kRefuse) {
    return reason;
  }
  if (existing == Existing::kSkip) {
    isSkipped = true;
    return Reason::kNone;
  }
  return Replace(name);
}

Reason NewFile::Replace(const std::string& name) {
  if (temporaryName_.empty()) {
    std::string own = temporaryName();
    if (const int error = link(Get(), folder_->Get(), own); error != 0) {
      return reasonOf(error);
    }
    temporaryName_ = std::move(own);
  }
  const Reason reason = folder_->Replace(temporaryName_, *folder_, name);
  if (reason == Reason::kNone) {
    temporaryName_.clear();
  }
  return reason;
}

}  // namespace files
