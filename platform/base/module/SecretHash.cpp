#include "platform/base/module/SecretHash.h"

#include <sha2.h>

#include <cstdint>

namespace QELO::Platform {

std::string secretHash(std::string_view secret) {
  uint8_t hash[SHA256_DIGEST_LENGTH];
  SHA2_CTX context;
  SHA256Init(&context);
  SHA256Update(&context, reinterpret_cast<const uint8_t*>(secret.data()), secret.size());
  SHA256Final(hash, &context);
  return {reinterpret_cast<const char*>(hash), sizeof hash};
}

}  // namespace QELO::Platform
