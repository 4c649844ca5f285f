#include "platform/Accounts.h"

#include <algorithm>

#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {

int isAdministrator(const Settings& settings, const Account& account) {
  gid_t administrators = 0;
  const std::string name = settings.Get("admin_group", "administrators");
  const Lookup lookup = findGroup(name, administrators);
  if (lookup != Lookup::kFound) {
    return lookup == Lookup::kAbsent ? 0 : -1;
  }
  std::vector<gid_t> groups;
  if (findGroupsOf(account, groups) != Lookup::kFound) {
    return -1;
  }
  return std::find(groups.begin(), groups.end(), administrators) != groups.end() ? 1 : 0;
}

bool isBarredFromLogin(const Account& account) {
  const std::string shell = account.shell.substr(account.shell.rfind('/') + 1);
  return account.name == "system" || shell == "nologin" || shell == "false";
}

}  // namespace QELO::Platform

using QELO::Platform::Account;
using QELO::Platform::Lookup;

extern "C" {

int QELOUserGetUGID(const char* name, uid_t* uid, gid_t* gid) {
  Account account;
  if (QELO::Platform::findAccount(name, account) != Lookup::kFound) {
    return -1;
  }
  *uid = account.uid;
  *gid = account.gid;
  return 0;
}

int QLIBGroupIsAdminGroupMem(const char* user, int) {
  Account account;
  const Lookup lookup = QELO::Platform::findAccount(user, account);
  if (lookup != Lookup::kFound) {
    return lookup == Lookup::kAbsent ? 0 : -1;
  }
  return QELO::Platform::isAdministrator(QELO::Platform::Settings(), account);
}

unsigned int QeloCgiUIDGet(const char*, const char* user) {
  Account account;
  return QELO::Platform::findAccount(user, account) == Lookup::kFound ? account.uid : 0xFFFFFFFFU;
}

}  // extern "C"
