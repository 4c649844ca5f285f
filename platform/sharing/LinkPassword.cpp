#include "platform/sharing/LinkPassword.h"

#include "platform/base/ModuleLoader.h"
#include "platform/login/module/PasswordCrypt.h"
#include "webapi/base/Log.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "LinkPassword.cpp";
constexpr int kLongestHash = 384;  ///< bytes with the NUL, what crypt(3) says of itself

}  // namespace

std::string hashLinkPassword(const std::string& password) {
  const auto hash =
      reinterpret_cast<PasswordCryptHash>(findInModule(kPasswordCryptModule, kPasswordCryptHash));
  char text[kLongestHash] = "";
  if (hash == nullptr || hash(password.c_str(), text, kLongestHash) != 0) {
    WEBAPI_LOG(kSource, "cannot hash a sharing link's password");
    return "";
  }
  return text;
}

int checkLinkPassword(const std::string& hash, const std::string& password) {
  const auto verify = reinterpret_cast<PasswordCryptVerify>(
      findInModule(kPasswordCryptModule, kPasswordCryptVerify));
  const int result = verify != nullptr ? verify(hash.c_str(), password.c_str()) : -1;
  if (result < 0) {
    WEBAPI_LOG(kSource, "cannot check a sharing link's password");
  }
  return result;
}

}  // namespace QELO::Platform
