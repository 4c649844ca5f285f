#include "platform/accounts/Accounts.h"

#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {

int isAdministrator(const Settings& settings, const Account& account) {
  switch (findMembership(account, settings.Get("admin_group", "administrators"))) {
    case Lookup::kFound:
      return 1;
    case Lookup::kAbsent:
      return 0;
    default:
      return -1;
  }
}

bool isBarredFromLogin(const Account& account) {
  const std::string shell = account.shell.substr(account.shell.rfind('/') + 1);
  return account.name == kWorkingAccount || shell == "nologin" || shell == "false";
}

Standing standingOf(const Account& account) {
  ShadowEntry entry;
  if (findShadow(account.name, entry) == Lookup::kFailed) {
    return Standing::kUnknown;
  }
  if (entry.HasExpired()) {
    return Standing::kExpired;
  }
  if (isBarredFromLogin(account)) {
    return Standing::kBarred;
  }
  return entry.IsLocked() ? Standing::kLocked : Standing::kGood;
}

const char* nameOf(Standing standing) {
  switch (standing) {
    case Standing::kGood:
      return "good";
    case Standing::kBarred:
      return "not for logins";
    case Standing::kLocked:
      return "locked";
    case Standing::kExpired:
      return "expired";
    default:
      return "not readable";
  }
}

}  // namespace QELO::Platform

using QELO::Platform::Account;
using QELO::Platform::Lookup;
using QELO::Platform::Standing;

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

const char* QELOUserStandingGet(const char* user) {
  Account account;
  switch (QELO::Platform::findAccount(user, account)) {
    case Lookup::kFound:
      return QELO::Platform::nameOf(standingOf(account));
    case Lookup::kAbsent:
      return nullptr;
    default:
      return QELO::Platform::nameOf(Standing::kUnknown);
  }
}

unsigned int QeloCgiUIDGet(const char*, const char* user) {
  Account account;
  return QELO::Platform::findAccount(user, account) == Lookup::kFound ? account.uid : 0xFFFFFFFFU;
}

}  // extern "C"
