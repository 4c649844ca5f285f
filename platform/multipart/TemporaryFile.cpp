#include "platform/multipart/TemporaryFile.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

#include "platform/base/Secrets.h"
#include "platform/multipart/LastWords.h"
#include "webapi/base/TextFile.h"

namespace QELO::Platform {
namespace {

constexpr mode_t kMode = S_IRUSR | S_IWUSR;
constexpr int kMostLookedAt = 4096;  ///< entries of a directory that one sweep reads
constexpr int kMostAttempts = 8;

struct Close {
  void operator()(DIR* stream) const { closedir(stream); }
};

std::string makeName() {
  const std::string secret = makeSecret();
  if (secret.empty()) {
    errno = EIO;
    return "";
  }
  return kTemporaryPrefix + secret;
}

bool isTemporaryName(std::string_view name) {
  const std::string_view prefix = kTemporaryPrefix;
  return name.starts_with(prefix) && isSecretText(name.substr(prefix.size()));
}

bool lacksNamelessFiles(int error) {
  return error == EOPNOTSUPP || error == EISDIR || error == EINVAL;
}

bool isSafe(const struct stat& info) {
  const bool isOurs = info.st_uid == 0 || info.st_uid == geteuid();
  return isOurs && ((info.st_mode & (S_IWGRP | S_IWOTH)) == 0 || (info.st_mode & S_ISVTX) != 0);
}

/// @return false, with errno
bool give(int file, const std::optional<FileOwner>& owner) {
  struct stat info {};
  if (!owner || fstat(file, &info) != 0) {
    return !owner;
  }
  const bool isTheirs = info.st_uid == owner->uid && info.st_gid == owner->gid;
  return isTheirs || fchown(file, owner->uid, owner->gid) == 0;
}

/// Makes a file with a name, for file systems that know no other, and locks it. Somebody's sweep
/// may find it before it is locked; then another one is made.
bool createNamed(int directory, std::string& name, UniqueFd& file) {
  for (int attempt = 0; attempt < kMostAttempts; ++attempt) {
    name = makeName();
    file = name.empty()
               ? UniqueFd()
               : UniqueFd(openat(directory, name.c_str(),
                                 O_CREAT | O_EXCL | O_NOFOLLOW | O_RDWR | O_CLOEXEC, kMode));
    struct stat info {};
    if (!file) {
      return false;
    }
    if (flock(file.Get(), LOCK_EX | LOCK_NB) == 0 && fstat(file.Get(), &info) == 0 &&
        info.st_nlink == 1) {
      return true;
    }
  }
  errno = EAGAIN;
  return false;
}

}  // namespace

bool TemporaryFolder::Open(const char* path) {
  UniqueFd opened(open(path, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!opened && errno == EACCES) {  // one that may be written to and searched, and not listed
    opened = UniqueFd(open(path, O_PATH | O_DIRECTORY | O_CLOEXEC));
  }
  struct stat info {};
  struct stat name {};
  if (!opened || fstat(opened.Get(), &info) != 0 || lstat(path, &name) != 0) {
    return false;
  }
  const bool isOurLink = name.st_uid == 0 || name.st_uid == geteuid();
  if (!isSafe(info) || (S_ISLNK(name.st_mode) && !isOurLink)) {
    errno = EPERM;
    return false;
  }
  path_ = path;
  directory_ = std::move(opened);
  return true;
}

void TemporaryFolder::Sweep() const {
  UniqueFd readable(openat(directory_.Get(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  const std::unique_ptr<DIR, Close> stream(readable ? fdopendir(readable.Get()) : nullptr);
  if (stream == nullptr) {
    return;
  }
  readable.Release();  // the stream closes it
  const dirent* entry = nullptr;
  for (int count = 0; count < kMostLookedAt && (entry = readdir(stream.get())) != nullptr;
       ++count) {
    UniqueFd file;
    struct stat info {};
    if (isTemporaryName(entry->d_name) &&
        OpenRegularFile(directory_.Get(), entry->d_name, file, info) == 0 &&
        flock(file.Get(), LOCK_EX | LOCK_NB) == 0) {
      unlinkat(directory_.Get(), entry->d_name, 0);
    }
  }
}

std::unique_ptr<TemporaryFile> TemporaryFile::Create(std::shared_ptr<const TemporaryFolder> folder,
                                                     const std::optional<FileOwner>& owner) {
  std::string name;
  UniqueFd file(openat(folder->Descriptor(), ".", O_TMPFILE | O_RDWR | O_CLOEXEC, kMode));
  if (file) {
    if (flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
      return nullptr;
    }
  } else if (!lacksNamelessFiles(errno) || !createNamed(folder->Descriptor(), name, file)) {
    return nullptr;
  }
  std::unique_ptr<TemporaryFile> made(new TemporaryFile(std::move(folder), std::move(file)));
  made->name_ = std::move(name);
  if (!made->name_.empty()) {
    LastWords::Add(made->folder_->Descriptor(), made->name_);
  }
  if (!give(made->file_.Get(), owner)) {
    const int error = errno;
    made.reset();
    errno = error;
  }
  return made;
}

std::unique_ptr<TemporaryFile> TemporaryFile::Adopt(std::shared_ptr<const TemporaryFolder> folder,
                                                    UniqueFd file, const std::string& name,
                                                    const std::optional<FileOwner>& owner) {
  const int directory = folder->Descriptor();
  std::string own = makeName();
  if (own.empty() || flock(file.Get(), LOCK_EX | LOCK_NB) != 0 || !give(file.Get(), owner)) {
    return nullptr;
  }
  std::unique_ptr<TemporaryFile> made(new TemporaryFile(std::move(folder), std::move(file)));
  LastWords::Add(directory, own);
  if (renameat(directory, name.c_str(), directory, own.c_str()) != 0) {
    const int error = errno;
    LastWords::Remove(directory, own);
    errno = error;
    return nullptr;
  }
  made->name_ = std::move(own);
  return made;
}

TemporaryFile::TemporaryFile(std::shared_ptr<const TemporaryFolder> folder, UniqueFd file)
    : folder_(std::move(folder)), file_(std::move(file)), maker_(getpid()) {}

TemporaryFile::~TemporaryFile() {
  if (!name_.empty() && maker_ == getpid()) {
    unlinkat(folder_->Descriptor(), name_.c_str(), 0);
    LastWords::Remove(folder_->Descriptor(), name_);
  }
}

bool TemporaryFile::Write(std::string_view bytes) const {
  return WriteText(file_.Get(), bytes);
}

bool TemporaryFile::Keep() {
  if (name_.empty()) {
    std::string name = makeName();
    LastWords::Add(folder_->Descriptor(), name);
    const std::string self = "/proc/self/fd/" + std::to_string(file_.Get());
    if (name.empty() || linkat(AT_FDCWD, self.c_str(), folder_->Descriptor(), name.c_str(),
                               AT_SYMLINK_FOLLOW) != 0) {
      const int error = errno;
      LastWords::Remove(folder_->Descriptor(), name);
      errno = error;
      return false;
    }
    name_ = std::move(name);
  }
  path_ = folder_->Path() + "/" + name_;
  return true;
}

}  // namespace QELO::Platform
