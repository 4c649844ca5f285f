#include "platform/base/PrivateDir.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <time.h>

#include <cerrno>
#include <string>

#include "webapi/platform/Core.h"

namespace QELO::Platform {
namespace {

constexpr mode_t kParentMode = 0755;
constexpr char kPurgeMark[] = ".purged";

bool makeDir(const char* path) {
  std::string parent = path;
  parent.resize(parent.rfind('/'));
  return QELOFSMkdirP(parent.c_str(), 1, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1),
                      kParentMode) == 0 &&
         (mkdir(path, S_IRWXU) == 0 || errno == EEXIST);
}

UniqueFd openPath(const char* path) {
  return UniqueFd(open(path, O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

bool isOlder(const struct stat& info, long age) {
  return time(nullptr) - info.st_mtim.tv_sec > age;
}

/// Whether nobody looked lately; notes that we do now.
bool mayPurge(int dir, long pause) {
  struct stat info {};
  if (pause <= 0) {
    return true;
  }
  if (fstatat(dir, kPurgeMark, &info, AT_SYMLINK_NOFOLLOW) == 0 && !isOlder(info, pause)) {
    return false;
  }
  const UniqueFd mark(
      openat(dir, kPurgeMark, O_WRONLY | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
  return mark && futimens(mark.Get(), nullptr) == 0;
}

}  // namespace

UniqueFd openPrivateDir(const char* path, bool create) {
  UniqueFd dir = openPath(path);
  if (!dir && errno == ENOENT && create && makeDir(path)) {
    dir = openPath(path);
  }
  struct stat info {};
  if (!dir || fstat(dir.Get(), &info) != 0) {
    return UniqueFd();
  }
  const bool ours = info.st_uid == geteuid() || info.st_uid == 0;
  if (!ours || (info.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
    errno = EPERM;
    return UniqueFd();
  }
  return dir;
}

bool purgeFiles(int dir, long age, long pause) {
  if (!mayPurge(dir, pause)) {
    return false;
  }
  UniqueFd readable(openat(dir, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  DIR* stream = readable ? fdopendir(readable.Get()) : nullptr;
  if (stream == nullptr) {
    return false;
  }
  readable.Release();  // closedir closes it
  while (const dirent* entry = readdir(stream)) {
    struct stat info {};
    if (entry->d_name[0] != '.' && fstatat(dir, entry->d_name, &info, AT_SYMLINK_NOFOLLOW) == 0 &&
        S_ISREG(info.st_mode) && isOlder(info, age)) {
      unlinkat(dir, entry->d_name, 0);
    }
  }
  closedir(stream);
  return true;
}

}  // namespace QELO::Platform
