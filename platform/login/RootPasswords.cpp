#include <cstring>

#include "platform/accounts/Accounts.h"
#include "platform/accounts/DatabaseFile.h"
#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/login/Passwords.h"
#include "platform/login/module/PasswordCrypt.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Session.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "RootPasswords.cpp";
/// Of no password; in use when the shadow file has no hash at all to take for a sample.
constexpr char kSampleHash[] =
    "$6$eNq0Zk3vT1pYwXcB$gXkeTHPxOKcPPSuPUxxhHMFHtDoeSEiKzUIZWcAMhzoi2ObWGNCzHvHFwpmUjqIa.s4vQR6z"
    "gmiuYYmsIymyV1";

struct ShadowPassword {
  ShadowEntry entry;   ///< its hash is "" when there is none to check against
  std::string sample;  ///< some account's hash
};

bool isHash(const char* text) {
  return text != nullptr && *text != '\0' && *text != '!' && *text != '*';
}

/// Reads the file to its end also when the account is found, which takes as long for every account.
bool readShadow(const std::string& account, ShadowPassword& password) {
  bool found = false;
  return readDatabaseFile<spwd>(Paths::kShadow, fgetspent_r, [&](const spwd& entry) {
    if (isHash(entry.sp_pwdp)) {
      password.sample = entry.sp_pwdp;
    }
    if (!found && account == entry.sp_namp) {
      found = true;
      password.entry = ShadowEntry(entry);
      password.entry.hash = isHash(entry.sp_pwdp) ? entry.sp_pwdp : "";
    }
    return false;
  });
}

}  // namespace

int checkPassword(const std::string& account, const std::string& password, const std::string&,
                  std::string& name) {
  const auto verify = reinterpret_cast<PasswordCryptVerify>(
      findInModule(kPasswordCryptModule, kPasswordCryptVerify));
  ShadowPassword shadow;
  Account found;
  const Lookup lookup = findAccount(account, found);
  if (verify == nullptr) {
    return QELO_PASSWORD_UNCHECKED;
  }
  if (lookup == Lookup::kFailed || !readShadow(account, shadow)) {
    WEBAPI_LOG(kSource, "cannot read the accounts [%s]", strerror(errno));
    return QELO_PASSWORD_UNCHECKED;
  }
  // Every answer costs one hash, so that its time does not tell which accounts there are.
  const std::string sample = shadow.sample.empty() ? kSampleHash : shadow.sample;
  const bool exists = lookup == Lookup::kFound && !shadow.entry.hash.empty();
  const bool matches = verify((exists ? shadow.entry.hash : sample).c_str(), password.c_str()) == 1;
  if (!exists || !matches) {
    return QELO_PASSWORD_WRONG;
  }
  if (shadow.entry.HasExpired() || shadow.entry.MustChange() || isBarredFromLogin(found)) {
    return QELO_PASSWORD_BARRED;
  }
  name = found.name;
  return QELO_PASSWORD_RIGHT;
}

}  // namespace QELO::Platform
