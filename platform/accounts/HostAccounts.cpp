#include <fcntl.h>
#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "platform/accounts/AccountDatabase.h"
#include "platform/base/Paths.h"

namespace QELO::Platform {
namespace {

constexpr size_t kFirstSize = 1024;
constexpr size_t kLargestEntry = 1 << 20;  // bytes
constexpr int kMostGroups = 65536;         // the kernel's own limit

/// Asks the name service for an entry by its name or number.
/// @param ask  getpwnam_r, getpwuid_r, getgrnam_r or getspnam_r
template <typename Key, typename Entry, typename Visit>
Lookup askFor(Key key, int (*ask)(Key, Entry*, char*, size_t, Entry**), Visit visit) {
  std::vector<char> buffer(kFirstSize);
  Entry entry;
  Entry* found = nullptr;
  int error = ask(key, &entry, buffer.data(), buffer.size(), &found);
  while (error == ERANGE && buffer.size() < kLargestEntry) {
    buffer.resize(buffer.size() * 2);
    error = ask(key, &entry, buffer.data(), buffer.size(), &found);
  }
  if (found != nullptr) {
    visit(*found);
    return Lookup::kFound;
  }
  return error == 0 || error == ENOENT || error == ESRCH ? Lookup::kAbsent : Lookup::kFailed;
}

}  // namespace

Lookup findAccount(const std::string& name, Account& account) {
  return askFor(name.c_str(), getpwnam_r, [&](const passwd& entry) {
    account = {entry.pw_name, entry.pw_uid, entry.pw_gid, entry.pw_dir, entry.pw_shell};
  });
}

Lookup findAccountById(uid_t uid, Account& account) {
  return askFor(uid, getpwuid_r, [&](const passwd& entry) {
    account = {entry.pw_name, entry.pw_uid, entry.pw_gid, entry.pw_dir, entry.pw_shell};
  });
}

Lookup findGroup(const std::string& name, gid_t& gid) {
  return askFor(name.c_str(), getgrnam_r, [&](const group& entry) { gid = entry.gr_gid; });
}

Lookup findShadow(const std::string& name, ShadowEntry& entry) {
  const Lookup lookup =
      askFor(name.c_str(), getspnam_r, [&](const spwd& found) { entry = ShadowEntry(found); });
  // To a process that may not read the file, its entries are as good as absent.
  const bool mayRead = lookup != Lookup::kAbsent ||
                       faccessat(AT_FDCWD, Paths::kShadow, R_OK, AT_EACCESS) == 0 ||
                       errno == ENOENT;
  return mayRead ? lookup : Lookup::kFailed;
}

Lookup findMembership(const Account& account, const std::string& groupName) {
  gid_t gid = 0;
  const Lookup lookup = findGroup(groupName, gid);
  if (lookup != Lookup::kFound) {
    return lookup;
  }
  std::vector<gid_t> groups;
  if (findGroupsOf(account, groups) != Lookup::kFound) {
    return Lookup::kFailed;
  }
  return std::find(groups.begin(), groups.end(), gid) != groups.end() ? Lookup::kFound
                                                                      : Lookup::kAbsent;
}

Lookup findGroupsOf(const Account& account, std::vector<gid_t>& groups) {
  std::vector<gid_t> found(32);
  int count = static_cast<int>(found.size());
  while (getgrouplist(account.name.c_str(), account.gid, found.data(), &count) < 0) {
    if (found.size() >= kMostGroups) {
      return Lookup::kFailed;
    }
    found.resize(found.size() * 2);
    count = static_cast<int>(found.size());
  }
  found.resize(static_cast<size_t>(count));
  groups.swap(found);
  return Lookup::kFound;
}

}  // namespace QELO::Platform
