#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "platform/accounts/ShadowEntry.h"

/// The users and groups of the system: the host's name service, or in a private root the files of
/// that root. HostAccounts.cpp and RootAccounts.cpp serve it; the build takes one of them.
namespace QELO::Platform {

struct Account {
  std::string name;
  uid_t uid = 0;
  gid_t gid = 0;
  std::string home;  ///< as the database has it, without the root's prefix
  std::string shell;
};

enum class Lookup {
  kFound,
  kAbsent,
  kFailed  ///< the database cannot be read
};

/// An output is unchanged unless the result is kFound.
Lookup findAccount(const std::string& name, Account& account);
/// The first account with this user id.
Lookup findAccountById(uid_t uid, Account& account);
Lookup findGroup(const std::string& name, gid_t& gid);
/// Whether the group is the account's primary one or lists it. @return kFound, kAbsent (also when
/// there is no such group) or kFailed
Lookup findMembership(const Account& account, const std::string& groupName);
/// What the shadow database keeps of the account; kAbsent when it has no entry there, as accounts
/// of a directory service have none.
Lookup findShadow(const std::string& name, ShadowEntry& entry);
/// The primary group and the supplementary ones. @return kFound or kFailed
Lookup findGroupsOf(const Account& account, std::vector<gid_t>& groups);

}  // namespace QELO::Platform
