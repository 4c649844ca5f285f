#include "platform/accounts/Accounts.h"
#include "platform/base/ModuleLoader.h"
#include "platform/login/Passwords.h"
#include "platform/login/module/PasswordPam.h"
#include "webapi/base/Log.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "HostPasswords.cpp";
constexpr int kLongestName = 256;  // characters of an account's name, with the NUL

}  // namespace

int checkPassword(const std::string& account, const std::string& password, std::string& name) {
  const auto check =
      reinterpret_cast<PasswordPamCheck>(findInModule(kPasswordPamModule, kPasswordPamCheck));
  if (check == nullptr) {
    return -1;
  }
  char spelled[kLongestName] = "";
  const int result =
      check(nullptr, account.c_str(), password.c_str(), spelled, static_cast<int>(sizeof spelled));
  if (result < 0) {
    WEBAPI_LOG(kSource, "PAM cannot check a password [%d]", result);
    return -1;
  }
  Account found;
  if (result == 0 || findAccount(spelled, found) != Lookup::kFound || isBarredFromLogin(found)) {
    return 0;
  }
  name = found.name;
  return 1;
}

}  // namespace QELO::Platform
