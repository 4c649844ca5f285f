#include "platform/tasks/StorePlace.h"

#include <fcntl.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "platform/base/Paths.h"
#include "platform/base/Secrets.h"
#include "webapi/base/Log.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "StorePlace.cpp";

bool isUsers(int parent, const std::string& name, uid_t user) {
  struct stat info {};
  return fstatat(parent, name.c_str(), &info, AT_SYMLINK_NOFOLLOW) == 0 && S_ISDIR(info.st_mode) &&
         info.st_uid == user;
}

/// Makes it under another name, so that it is the user's from its first moment under its own.
bool makeStore(int parent, const std::string& name, uid_t user, gid_t group) {
  const std::string fresh = name + ".new." + makeSecret();
  if (mkdirat(parent, fresh.c_str(), S_IRWXU) != 0) {
    return false;
  }
  if (fchownat(parent, fresh.c_str(), user, group, AT_SYMLINK_NOFOLLOW) == 0 &&
      renameat2(parent, fresh.c_str(), parent, name.c_str(), RENAME_NOREPLACE) == 0) {
    return true;
  }
  unlinkat(parent, fresh.c_str(), AT_REMOVEDIR);
  return false;
}

}  // namespace

void reserveTaskStore(uid_t user, gid_t group) {
  if (geteuid() != 0) {
    return;
  }
  const UniqueFd parent(open(Paths::kTaskDir, O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  const std::string name = std::to_string(user);
  if (!parent || isUsers(parent.Get(), name, user) || makeStore(parent.Get(), name, user, group)) {
    return;
  }
  const std::string aside = name + ".stranger." + makeSecret();
  if (!isUsers(parent.Get(), name, user) &&
      renameat(parent.Get(), name.c_str(), parent.Get(), aside.c_str()) == 0) {
    WEBAPI_LOG(kSource, "somebody else made the task store %s/%s, which is kept as %s",
               Paths::kTaskDir, name.c_str(), aside.c_str());
    makeStore(parent.Get(), name, user, group);
  }
}

}  // namespace QELO::Platform
