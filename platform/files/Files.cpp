#include <fcntl.h>
#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "platform/settings/Settings.h"
#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Core.h"

namespace {

constexpr uid_t kAnyUid = static_cast<uid_t>(-1);
constexpr gid_t kAnyGid = static_cast<gid_t>(-1);

struct Directory {
  uid_t uid;
  gid_t gid;
  mode_t mode;
  bool keepExistingOwner;
};

/// Search permission wherever the mode grants reading.
mode_t withSearch(mode_t mode) {
  return mode | (mode & (S_IRUSR | S_IRGRP | S_IROTH)) >> 2U;
}

bool hasOwner(const Directory& wanted) {
  return wanted.uid != kAnyUid || wanted.gid != kAnyGid;
}

/// Creates one directory. @return 0, also when it exists, else the errno
int createOne(const char* path, const Directory& wanted, bool isLast) {
  if (mkdir(path, wanted.mode) != 0) {
    const bool chownExisting =
        errno == EEXIST && isLast && !wanted.keepExistingOwner && hasOwner(wanted);
    if (!chownExisting) {
      return errno == EEXIST ? 0 : errno;
    }
    return lchown(path, wanted.uid, wanted.gid) == 0 ? 0 : errno;
  }
  if (hasOwner(wanted) && lchown(path, wanted.uid, wanted.gid) != 0) {
    return errno;
  }
  return chmod(path, wanted.mode) == 0 ? 0 : errno;  // mkdir's was subject to the umask
}

}  // namespace

extern "C" {

int QLIBCFileExist(const char* path) {
  struct stat info {};
  return stat(path, &info) == 0 ? 1 : 0;
}

int QLIBCFileTouch(const char* path) {
  if (utimensat(AT_FDCWD, path, nullptr, 0) == 0) {
    return 0;
  }
  if (errno != ENOENT) {
    return -1;
  }
  const QELO::UniqueFd file(
      open(path, O_WRONLY | O_CREAT | O_CLOEXEC | O_NONBLOCK | O_NOCTTY, 0600));
  return file ? 0 : -1;
}

int QLIBCFileCheckKeyValue(const char* file, const char* key, const char* value, int ignoreCase) {
  std::string found;
  if (!QELO::Platform::readKeyValueFile(file)->Get(key, found)) {
    return 0;
  }
  const int order =
      ignoreCase != 0 ? strcasecmp(found.c_str(), value) : strcmp(found.c_str(), value);
  return order == 0 ? 1 : 0;
}

int QELOFSMkdirP(const char* path, int keepExistingOwner, int, uid_t uid, gid_t gid, mode_t mode) {
  const Directory wanted{uid, gid, withSearch(mode), keepExistingOwner != 0};
  struct stat info {};
  if ((keepExistingOwner != 0 || !hasOwner(wanted)) && stat(path, &info) == 0 &&
      S_ISDIR(info.st_mode)) {
    return 0;  // nothing is left to do, and no attempt on each parent
  }
  const std::string whole = path;
  size_t end = 0;
  while (end < whole.size()) {
    end = whole.find('/', end + 1);
    const bool isLast = whole.find_first_not_of('/', end) == std::string::npos;
    if (createOne(whole.substr(0, end).c_str(), wanted, isLast) != 0 && isLast) {
      return -1;  // a parent that cannot be made, as "/" on a read-only disk, may well exist
    }
    if (isLast) {
      break;
    }
  }
  return stat(path, &info) == 0 && S_ISDIR(info.st_mode) ? 0 : -1;
}

}  // extern "C"
