#include "platform/tasks/Access.h"

#include <pwd.h>
#include <unistd.h>

#include "platform/accounts/Accounts.h"
#include "platform/accounts/DatabaseFile.h"
#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/settings/Settings.h"
#include "platform/tasks/Id.h"

namespace QELO::Platform {
namespace {

constexpr size_t kOwnerLength = 1024;  // longest owner, bytes
constexpr char kAdministrators[] = "@administrators";
constexpr char kEverybody[] = "@users";

constexpr int kKeepSeconds = 7 * 86400;
constexpr int kLongestKeepSeconds = 10 * 366 * 86400;

int keepSeconds() {
  return Settings().GetNumber("task_keep_seconds", kKeepSeconds, 0, kLongestKeepSeconds);
}

/// The name of a user of the system, "" when there is none.
std::string nameOf(uid_t user) {
  std::string name;
  if constexpr (sizeof(Paths::kRootPrefix) == 1) {
    const passwd* entry = getpwuid(user);
    return entry != nullptr ? entry->pw_name : "";
  }
  readDatabaseFile<passwd>(Paths::kPasswd, fgetpwent_r, [&](const passwd& entry) {
    const bool found = entry.pw_uid == user;
    name = found ? entry.pw_name : "";
    return found;
  });
  return name;
}

}  // namespace

TaskStores* openTaskStores() {
  static const TaskStoreSettings settings{Paths::kTaskDir, keepSeconds};
  const auto get = reinterpret_cast<TaskStoresGet>(findInModule(kTaskModule, kTaskStoresGet));
  return get != nullptr ? get(&settings) : nullptr;
}

bool makeTaskKey(const std::string& owner, const std::string& id, TaskKey& key) {
  uid_t store = 0;
  if (owner.empty() || owner.size() > kOwnerLength || !readTaskId(id, store) ||
      (store != geteuid() && geteuid() != 0)) {
    return false;
  }
  const Standing standing = standingOf(store, owner);
  if (standing == Standing::kNothing) {
    return false;
  }
  key = {store, owner, id, patienceWith(standing)};
  return true;
}

Standing standingOf(uid_t store, const std::string& owner) {
  Account account;
  if (store == geteuid()) {
    return Standing::kOwn;
  }
  if (findAccount(nameOf(store), account) != Lookup::kFound || account.uid != store) {
    return Standing::kNothing;
  }
  if (account.name == kWorkingAccount || owner == account.name) {
    return Standing::kOwn;
  }
  const bool isShared = owner == kEverybody ||
                        (owner == kAdministrators && isAdministrator(Settings(), account) == 1);
  return isShared ? Standing::kShared : Standing::kNothing;
}

int patienceWith(Standing standing) {
  return standing == Standing::kOwn ? kOwnStoreMs : kForeignStoreMs;
}

}  // namespace QELO::Platform
