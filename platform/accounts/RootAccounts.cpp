#include <grp.h>
#include <pwd.h>

#include <algorithm>

#include "platform/accounts/AccountDatabase.h"
#include "platform/accounts/DatabaseFile.h"
#include "platform/base/KnownFile.h"
#include "platform/base/Paths.h"

namespace QELO::Platform {
namespace {

struct Group {
  std::string name;
  gid_t gid = 0;
  std::vector<std::string> members;

  bool Lists(const std::string& account) const {
    return std::find(members.begin(), members.end(), account) != members.end();
  }
};

struct AccountFile {
  AccountFile() = default;
  explicit AccountFile(const char* path) {
    readable = readDatabaseFile<passwd>(path, fgetpwent_r, [this](const passwd& entry) {
      entries.push_back({entry.pw_name, entry.pw_uid, entry.pw_gid, entry.pw_dir, entry.pw_shell});
      return false;
    });
  }

  bool readable = false;
  std::vector<Account> entries;
};

struct GroupFile {
  GroupFile() = default;
  explicit GroupFile(const char* path) {
    readable = readDatabaseFile<group>(path, fgetgrent_r, [this](const group& entry) {
      Group& added = entries.emplace_back(Group{entry.gr_name, entry.gr_gid, {}});
      for (char** member = entry.gr_mem; *member != nullptr; ++member) {
        added.members.emplace_back(*member);
      }
      return false;
    });
  }

  bool readable = false;
  std::vector<Group> entries;
};

std::shared_ptr<const AccountFile> accounts() {
  static KnownFile<AccountFile> file(Paths::kPasswd);
  return file.Get();
}

std::shared_ptr<const GroupFile> groups() {
  static KnownFile<GroupFile> file(Paths::kGroup);
  return file.Get();
}

/// The first entry of that name counts, as it does for the C library.
template <typename File>
auto find(const File& file, const std::string& name) {
  const auto found = std::find_if(file.entries.begin(), file.entries.end(),
                                  [&name](const auto& entry) { return entry.name == name; });
  return found != file.entries.end() ? &*found : nullptr;
}

}  // namespace

Lookup findAccount(const std::string& name, Account& account) {
  const auto file = accounts();
  const Account* found = find(*file, name);
  if (found != nullptr) {
    account = *found;
    return Lookup::kFound;
  }
  return file->readable ? Lookup::kAbsent : Lookup::kFailed;
}

Lookup findGroup(const std::string& name, gid_t& gid) {
  const auto file = groups();
  const Group* found = find(*file, name);
  if (found != nullptr) {
    gid = found->gid;
    return Lookup::kFound;
  }
  return file->readable ? Lookup::kAbsent : Lookup::kFailed;
}

Lookup findMembership(const Account& account, const std::string& groupName) {
  const auto file = groups();
  const Group* found = find(*file, groupName);
  if (found == nullptr) {
    return file->readable ? Lookup::kAbsent : Lookup::kFailed;
  }
  return found->gid == account.gid || found->Lists(account.name) ? Lookup::kFound : Lookup::kAbsent;
}

Lookup findGroupsOf(const Account& account, std::vector<gid_t>& groupIds) {
  const auto file = groups();
  if (!file->readable) {
    return Lookup::kFailed;
  }
  groupIds.assign(1, account.gid);
  for (const Group& group : file->entries) {
    if (group.gid != account.gid && group.Lists(account.name)) {
      groupIds.push_back(group.gid);
    }
  }
  return Lookup::kFound;
}

}  // namespace QELO::Platform
