#include "platform/login/Passwords.h"

#include <algorithm>

#include "platform/base/TextBuffer.h"
#include "webapi/platform/Session.h"

using namespace QELO::Platform;

extern "C" int QeloLoginPasswordCheck(const char* account, const char* password,
                                      const char* address, char* user, int size) {
  fillBuffer("", user, size);
  if (account == nullptr || password == nullptr || address == nullptr) {
    return QELO_PASSWORD_UNCHECKED;
  }
  const std::string wanted = account;
  const bool printable = std::none_of(wanted.begin(), wanted.end(), [](char c) {
    return static_cast<unsigned char>(c) < ' ' || c == '\x7F';
  });
  if (wanted.empty() || !printable) {
    return QELO_PASSWORD_WRONG;
  }
  std::string name;
  const int result = checkPassword(wanted, password, address, name);
  const bool isRight = result == QELO_PASSWORD_RIGHT;
  return isRight && !fillBuffer(name, user, size) ? QELO_PASSWORD_UNCHECKED : result;
}
