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

Usability usabilityOf(const Account& account) {
  ShadowEntry entry;
  if (findShadow(account.name, entry) == Lookup::kFailed) {
    return Usability::kUnknown;
  }
  if (entry.HasExpired()) {
    return Usability::kExpired;
  }
  if (isBarredFromLogin(account)) {
    return Usability::kBarred;
  }
  return entry.IsLocked() ? Usability::kLocked : Usability::kGood;
}

const char* usabilityName(Usability usability) {
  switch (usability) {
    case Usability::kGood:
      return "good";
    case Usability::kBarred:
      return "not for logins";
    case Usability::kLocked:
      return "locked";
    case Usability::kExpired:
      return "expired";
    default:
      return "not readable";
  }
}

}  // namespace QELO::Platform

using QELO::Platform::Account;
using QELO::Platform::Lookup;
using QELO::Platform::Usability;

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
      return QELO::Platform::usabilityName(usabilityOf(account));
    case Lookup::kAbsent:
      return nullptr;
    default:
      return QELO::Platform::usabilityName(Usability::kUnknown);
  }
}

unsigned int QeloCgiUIDGet(const char*, const char* user) {
  Account account;
  return QELO::Platform::findAccount(user, account) == Lookup::kFound ? account.uid : 0xFFFFFFFFU;
}

}  // extern "C"
