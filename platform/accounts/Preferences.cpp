#include <fcntl.h>
#include <sys/fsuid.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "platform/accounts/AccountDatabase.h"
#include "platform/base/Paths.h"
#include "platform/base/TextBuffer.h"
#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {
namespace {

/// Opens a directory without following a link at its end, and takes its status.
bool openDirectory(int parent, const char* name, UniqueFd& directory, struct stat& info) {
  directory = UniqueFd(openat(parent, name, O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  return directory && fstat(directory.Get(), &info) == 0;
}

/// Creates a directory with the rights and the ownership of a user, wherever a link that the user
/// laid may lead.
bool makeDirectoryAs(const Account& user, const std::string& path) {
  if (geteuid() == 0) {
    setfsgid(user.gid);
    setfsuid(user.uid);
  }
  const bool made = mkdir(path.c_str(), S_IRWXU) == 0 || errno == EEXIST;
  setfsuid(geteuid());
  setfsgid(getegid());
  return made;
}

bool prepareUserDirectory(const Account& user, const std::string& path) {
  UniqueFd directory;
  struct stat info {};
  if (!openDirectory(AT_FDCWD, path.c_str(), directory, info) &&
      !(makeDirectoryAs(user, path) && openDirectory(AT_FDCWD, path.c_str(), directory, info))) {
    return false;
  }
  return info.st_uid == user.uid;
}

/// Creates a group's directory: the group's members work in it when we may give it to them.
bool prepareGroupDirectory(gid_t gid, const std::string& path) {
  constexpr mode_t kTraversable = 0711;
  constexpr mode_t kShared = S_ISGID | S_IRWXU | S_IRWXG;
  UniqueFd directory;
  struct stat info {};
  if (openDirectory(AT_FDCWD, path.c_str(), directory, info)) {
    return true;
  }
  if (QELOFSMkdirP(Paths::kGroupPreferenceDir, 1, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1),
                   kTraversable) != 0 ||
      (mkdir(path.c_str(), S_IRWXU) != 0 && errno != EEXIST) ||
      !openDirectory(AT_FDCWD, path.c_str(), directory, info)) {
    return false;
  }
  return geteuid() != 0 || (lchown(path.c_str(), 0, gid) == 0 && chmod(path.c_str(), kShared) == 0);
}

bool isPlainName(const std::string& name) {
  return !name.empty() && name.front() != '.' && name.find('/') == std::string::npos;
}

}  // namespace
}  // namespace QELO::Platform

extern "C" {

int QELOUserPreferenceDirGet(const char* user, char* path, int size) {
  using namespace QELO::Platform;
  fillBuffer("", path, size);
  Account account;
  if (findAccount(user, account) != Lookup::kFound || account.home.empty() ||
      account.home.front() != '/') {
    return -1;
  }
  const std::string directory = QELO::Paths::kRootPrefix + account.home + "/.webapi";
  return prepareUserDirectory(account, directory) && fillBuffer(directory, path, size) ? 0 : -1;
}

int QELOGroupPreferenceDirGet(const char* group, char* path, int size) {
  using namespace QELO::Platform;
  fillBuffer("", path, size);
  gid_t gid = 0;
  if (!isPlainName(group) || findGroup(group, gid) != Lookup::kFound) {
    return -1;
  }
  const std::string directory = std::string(QELO::Paths::kGroupPreferenceDir) + "/" + group;
  return prepareGroupDirectory(gid, directory) && fillBuffer(directory, path, size) ? 0 : -1;
}

}  // extern "C"
