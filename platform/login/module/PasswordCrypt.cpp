#include "platform/login/module/PasswordCrypt.h"

#include <crypt.h>

#include <cstring>
#include <memory>

#include "platform/base/Secrets.h"
#include "webapi/Export.h"

extern "C" WEBAPI_API int webapiPasswordVerify(const char* hash, const char* password) {
  const auto work = std::make_unique<crypt_data>();  // 32 KiB, zeroed
  const char* result = crypt_rn(password, hash, work.get(), sizeof *work);
  const bool known = result != nullptr;
  const bool matches = known && QELO::Platform::equalSecrets(result, hash);
  explicit_bzero(work.get(), sizeof *work);
  return known ? static_cast<int>(matches) : -1;
}

extern "C" WEBAPI_API int webapiPasswordHash(const char* password, char* hash, int size) {
  char salt[CRYPT_GENSALT_OUTPUT_SIZE] = "";
  if (crypt_gensalt_rn(nullptr, 0, nullptr, 0, salt, sizeof salt) == nullptr) {
    return -1;
  }
  const auto work = std::make_unique<crypt_data>();
  const char* made = crypt_rn(password, salt, work.get(), sizeof *work);
  const bool fits = made != nullptr && strlen(made) < static_cast<size_t>(size);
  if (fits) {
    strcpy(hash, made);
  }
  explicit_bzero(work.get(), sizeof *work);
  return fits ? 0 : -1;
}
