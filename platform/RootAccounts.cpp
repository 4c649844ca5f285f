#include <grp.h>
#include <pwd.h>

#include "platform/AccountDatabase.h"
#include "platform/DatabaseFile.h"
#include "platform/PlatformPaths.h"

namespace QELO::Platform {
namespace {

bool lists(const group& entry, const std::string& name) {
  char** member = entry.gr_mem;
  while (*member != nullptr && name != *member) {
    ++member;
  }
  return *member != nullptr;
}

}  // namespace

Lookup findAccount(const std::string& name, Account& account) {
  bool found = false;
  const bool readable = readDatabaseFile<passwd>(Paths::kPasswd, fgetpwent_r, [&](passwd& entry) {
    found = name == entry.pw_name;
    if (found) {
      account = {entry.pw_name, entry.pw_uid, entry.pw_gid, entry.pw_dir, entry.pw_shell};
    }
    return found;
  });
  if (!readable) {
    return Lookup::kFailed;
  }
  return found ? Lookup::kFound : Lookup::kAbsent;
}

Lookup findGroup(const std::string& name, gid_t& gid) {
  bool found = false;
  const bool readable = readDatabaseFile<group>(Paths::kGroup, fgetgrent_r, [&](group& entry) {
    found = name == entry.gr_name;
    if (found) {
      gid = entry.gr_gid;
    }
    return found;
  });
  if (!readable) {
    return Lookup::kFailed;
  }
  return found ? Lookup::kFound : Lookup::kAbsent;
}

Lookup findMembership(const Account& account, const std::string& groupName) {
  bool found = false;
  const bool readable = readDatabaseFile<group>(Paths::kGroup, fgetgrent_r, [&](group& entry) {
    if (groupName != entry.gr_name) {
      return false;
    }
    found = entry.gr_gid == account.gid || lists(entry, account.name);
    return true;
  });
  if (!readable) {
    return Lookup::kFailed;
  }
  return found ? Lookup::kFound : Lookup::kAbsent;
}

Lookup findGroupsOf(const Account& account, std::vector<gid_t>& groups) {
  std::vector<gid_t> found{account.gid};
  const bool readable = readDatabaseFile<group>(Paths::kGroup, fgetgrent_r, [&](group& entry) {
    if (entry.gr_gid != account.gid && lists(entry, account.name)) {
      found.push_back(entry.gr_gid);
    }
    return false;
  });
  if (!readable) {
    return Lookup::kFailed;
  }
  groups.swap(found);
  return Lookup::kFound;
}

}  // namespace QELO::Platform
