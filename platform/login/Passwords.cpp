#include "platform/login/Passwords.h"

#include <algorithm>

#include "platform/base/TextBuffer.h"
#include "webapi/platform/Session.h"

using namespace QELO::Platform;

extern "C" int QeloLoginPasswordCheck(const char* account, const char* password, char* user,
                                      int size) {
  fillBuffer("", user, size);
  if (account == nullptr || password == nullptr) {
    return -1;
  }
  const std::string wanted = account;
  const bool printable = std::none_of(wanted.begin(), wanted.end(), [](char c) {
    return static_cast<unsigned char>(c) < ' ' || c == '\x7F';
  });
  if (wanted.empty() || !printable) {
    return 0;
  }
  std::string name;
  const int result = checkPassword(wanted, password, name);
  return result == 1 && !fillBuffer(name, user, size) ? -1 : result;
}
