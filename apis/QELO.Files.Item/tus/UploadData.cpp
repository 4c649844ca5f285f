#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "tus/Upload.h"

namespace files {
namespace {

constexpr mode_t kPrivateMode = 0600;
constexpr mode_t kMode = 0666;  ///< of the whole file, before the process's mask

mode_t processMask() {
  const mode_t mask = umask(0);
  umask(mask);
  return mask;
}

}  // namespace

Reason UploadData::Make(const Folder& folder, UploadState& state, UploadData& data) {
  UploadData made;
  if (const Reason reason = folder.Enter(".", made.folder_); reason != Reason::kNone) {
    return reason;
  }
  state.dataName = temporaryName();
  made.file_ = Descriptor(openat(made.folder_.Get(), state.dataName.c_str(),
                                 O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, kPrivateMode));
  struct stat info {};
  if (!made.file_ || fstat(made.Get(), &info) != 0 || flock(made.Get(), LOCK_EX | LOCK_NB) != 0) {
    return reasonOf(errno);
  }
  state.inode = info.st_ino;
  data = std::move(made);
  return Reason::kNone;
}

Reason UploadData::Open(const Shares& shares, const UploadState& state, UploadData& data) {
  UploadData opened;
  const Reason reason = openFolder(shares, state.path.Parent(), opened.folder_);
  if (reason != Reason::kNone) {
    return reason;
  }
  opened.file_ = Descriptor(openat(opened.folder_.Get(), state.dataName.c_str(),
                                   O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  struct stat info {};
  if (!opened.file_) {
    return reasonOf(errno);
  }
  if (fstat(opened.Get(), &info) != 0 || !S_ISREG(info.st_mode) || info.st_ino != state.inode ||
      info.st_uid != geteuid() || info.st_nlink != 1) {
    return Reason::kChanged;
  }
  if (flock(opened.Get(), LOCK_EX | LOCK_NB) != 0) {
    return Reason::kBusy;
  }
  data = std::move(opened);
  return Reason::kNone;
}

uint64_t UploadData::Length() const {
  struct stat info {};
  return fstat(Get(), &info) == 0 ? static_cast<uint64_t>(info.st_size) : 0;
}

time_t UploadData::LastChange() const {
  struct stat info {};
  return fstat(Get(), &info) == 0 ? info.st_mtime : 0;
}

Reason UploadData::Cut(uint64_t length) const {
  return ftruncate(Get(), static_cast<off_t>(length)) == 0 ? Reason::kNone : reasonOf(errno);
}

Reason UploadData::Finish(const UploadState& state) const {
  const std::string name = state.path.Name();
  if (fchmod(Get(), kMode & ~processMask()) != 0) {
    return reasonOf(errno);
  }
  if (state.existing == Existing::kReplace) {
    return folder_.Replace(state.dataName, folder_, name);
  }
  const Reason reason = folder_.Move(state.dataName, folder_, name);
  if (reason == Reason::kExists && state.existing == Existing::kSkip) {
    return folder_.RemoveFile(state.dataName);
  }
  return reason;
}

void UploadData::Remove(const UploadState& state) const {
  if (file_) {
    folder_.RemoveFile(state.dataName);
  }
}

}  // namespace files
