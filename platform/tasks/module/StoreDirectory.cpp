#include "platform/tasks/module/StoreDirectory.h"

#include <fcntl.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "platform/base/Secrets.h"
#include "platform/tasks/Id.h"

namespace QELO::Platform {
namespace {

constexpr mode_t kStateMode = 0711;    // others pass through
constexpr mode_t kParentMode = 01733;  // others add their own, see no names, remove nobody's
constexpr int kPathFlags = O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;

/// Makes a directory that has its mode from its first moment, whatever the umask.
bool makeDirectory(const std::string& path, mode_t mode) {
  const std::string fresh = path + "." + makeSecret();
  if (mkdir(fresh.c_str(), S_IRWXU) != 0) {
    return false;
  }
  if (chmod(fresh.c_str(), mode) == 0 &&
      renameat2(AT_FDCWD, fresh.c_str(), AT_FDCWD, path.c_str(), RENAME_NOREPLACE) == 0) {
    return true;
  }
  const int error = errno;
  rmdir(fresh.c_str());
  errno = error;
  return error == EEXIST;
}

UniqueFd openParent(const std::string& path, bool create) {
  UniqueFd parent(open(path.c_str(), kPathFlags));
  if (!parent && errno == ENOENT && create) {
    const std::string state = path.substr(0, path.rfind('/'));
    if ((access(state.c_str(), F_OK) == 0 || makeDirectory(state, kStateMode)) &&
        makeDirectory(path, kParentMode)) {
      parent = UniqueFd(open(path.c_str(), kPathFlags));
    }
  }
  return parent;
}

/// Whether nobody but its owner, root or ourselves, can take away what others put there.
bool isSafeParent(const struct stat& info) {
  const bool shared = (info.st_mode & (S_IWGRP | S_IWOTH)) != 0;
  return (info.st_uid == 0 || info.st_uid == geteuid()) &&
         (!shared || (info.st_mode & S_ISVTX) != 0);
}

}  // namespace

StoreDirectory::Result StoreDirectory::Open(const std::string& parent, uid_t store, bool create) {
  const bool own = store == geteuid();
  const UniqueFd opened = openParent(parent, create && own);
  struct stat info {};
  if (!opened) {
    return errno == ENOENT && !create ? Result::kMissing : Refuse(strerror(errno));
  }
  if (fstat(opened.Get(), &info) != 0 || !isSafeParent(info)) {
    return Refuse("others may change the parent directory");
  }
  char* real = realpath(parent.c_str(), nullptr);
  if (real == nullptr) {
    return Refuse(strerror(errno));
  }
  const std::string name = std::to_string(store);
  path_ = std::string(real) + "/" + name;
  free(real);
  return OpenChild(opened.Get(), name, store, create && own);
}

StoreDirectory::Result StoreDirectory::OpenChild(int parent, const std::string& name, uid_t store,
                                                 bool create) {
  constexpr int kFlags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  struct stat info {};
  UniqueFd child(openat(parent, name.c_str(), kFlags));
  if (!child && errno == ENOENT && create &&
      (mkdirat(parent, name.c_str(), S_IRWXU) == 0 || errno == EEXIST)) {
    child = UniqueFd(openat(parent, name.c_str(), kFlags));
  }
  if (!child) {
    return errno == ENOENT && !create ? Result::kMissing : Refuse(strerror(errno));
  }
  if (fstat(child.Get(), &info) != 0 || info.st_uid != store ||
      (info.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
    return Refuse("the directory is not the user's alone");
  }
  group_ = info.st_gid;
  fd_ = std::move(child);
  return Result::kOpen;
}

StoreDirectory::Result StoreDirectory::Refuse(const char* reason) {
  error_ = reason;
  return Result::kRefused;
}

std::vector<uid_t> listStores(const std::string& parent) {
  std::vector<uid_t> stores;
  std::error_code error;
  for (std::filesystem::directory_iterator entry(parent, error), end; !error && entry != end;
       entry.increment(error)) {
    uid_t store = 0;
    struct stat info {};
    if (readStoreName(entry->path().filename().string(), store) &&
        lstat(entry->path().c_str(), &info) == 0 && info.st_uid == store) {
      stores.push_back(store);
    }
  }
  return stores;
}

}  // namespace QELO::Platform
