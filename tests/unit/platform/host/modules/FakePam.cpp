// In the place of the PAM module: answers with the number in FAKE_PAM_RESULT and, when that is 1,
// with the name in FAKE_PAM_USER. The client's address must be the one in FAKE_PAM_ADDRESS.

#include <cstdlib>
#include <cstring>

#include "platform/base/TextBuffer.h"
#include "webapi/Export.h"

extern "C" WEBAPI_API int webapiPamCheck(const char* configuration, const char*, const char*,
                                         const char* address, char* user, int size) {
  const char* result = getenv("FAKE_PAM_RESULT");
  const char* name = getenv("FAKE_PAM_USER");
  const char* wanted = getenv("FAKE_PAM_ADDRESS");
  if (wanted == nullptr || strcmp(address, wanted) != 0) {
    return -98;
  }
  if (configuration != nullptr || result == nullptr || name == nullptr) {
    return -99;  // the host's own configuration is what is to be asked for
  }
  QELO::Platform::fillBuffer(name, user, size);
  return atoi(result);
}
