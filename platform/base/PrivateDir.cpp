#include "platform/base/PrivateDir.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <time.h>

#include <cerrno>
#include <functional>
#include <string>
#include <utility>

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

/// Notes that we look now. Its size is the number of names that were there the last time.
/// @param names  receives that number
/// @return none when somebody looked lately
UniqueFd openMark(int dir, long pause, size_t& names) {
  struct stat info {};
  const bool known = fstatat(dir, kPurgeMark, &info, AT_SYMLINK_NOFOLLOW) == 0;
  names = known ? static_cast<size_t>(info.st_size) : 0;
  if (known && pause > 0 && !isOlder(info, pause)) {
    return UniqueFd();
  }
  UniqueFd mark(
      openat(dir, kPurgeMark, O_WRONLY | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
  return mark && futimens(mark.Get(), nullptr) == 0 ? std::move(mark) : UniqueFd();
}

/// Whether this file may go.
bool isStale(int dir, const char* name, long age) {
  struct stat info {};
  return fstatat(dir, name, &info, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(info.st_mode) &&
         isOlder(info, age);
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

PurgeShare::PurgeShare(size_t names) : shares_(names / kMost + 1), drawn_(0) {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  drawn_ = static_cast<size_t>(now.tv_nsec) % shares_;
}

bool PurgeShare::Has(std::string_view name) const {
  return shares_ == 1 || std::hash<std::string_view>()(name) % shares_ == drawn_;
}

std::optional<PurgeShare> purgeFiles(int dir, long age, long pause) {
  size_t names = 0;
  const UniqueFd mark = openMark(dir, pause, names);
  UniqueFd readable(mark ? openat(dir, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC) : -1);
  DIR* stream = readable ? fdopendir(readable.Get()) : nullptr;
  if (stream == nullptr) {
    return std::nullopt;
  }
  readable.Release();  // closedir closes it
  const PurgeShare share(names);
  names = 0;
  while (const dirent* entry = readdir(stream)) {
    ++names;
    if (entry->d_name[0] != '.' && share.Has(entry->d_name) && isStale(dir, entry->d_name, age)) {
      unlinkat(dir, entry->d_name, 0);
      --names;
    }
  }
  closedir(stream);
  [[maybe_unused]] const int kept = ftruncate(mark.Get(), static_cast<off_t>(names));
  return share;
}

}  // namespace QELO::Platform
