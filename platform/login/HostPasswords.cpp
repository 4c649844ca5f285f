#include "platform/accounts/Accounts.h"
#include "platform/base/ModuleLoader.h"
#include "platform/login/Passwords.h"
#include "platform/login/module/PasswordPam.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Session.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "HostPasswords.cpp";
constexpr int kLongestName = 256;  // characters of an account's name, with the NUL

}  // namespace

int checkPassword(const std::string& account, const std::string& password,
                  const std::string& address, std::string& name) {
  const auto check =
      reinterpret_cast<PasswordPamCheck>(findInModule(kPasswordPamModule, kPasswordPamCheck));
  if (check == nullptr) {
    return QELO_PASSWORD_UNCHECKED;
  }
  char spelled[kLongestName] = "";
  const int result = check(nullptr, account.c_str(), password.c_str(), address.c_str(), spelled,
                           static_cast<int>(sizeof spelled));
  if (result < 0) {
    WEBAPI_LOG(kSource, "PAM cannot check a password [%d]", result);
    return QELO_PASSWORD_UNCHECKED;
  }
  if (result != QELO_PASSWORD_RIGHT) {
    return result;
  }
  Account found;
  if (findAccount(spelled, found) != Lookup::kFound) {
    return QELO_PASSWORD_WRONG;
  }
  if (isBarredFromLogin(found)) {
    return QELO_PASSWORD_BARRED;
  }
  name = found.name;
  return QELO_PASSWORD_RIGHT;
}

}  // namespace QELO::Platform
