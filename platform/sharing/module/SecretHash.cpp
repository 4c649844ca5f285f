// The short interface, which the static library serves from a few kilobytes; the long one loads its
// tables of algorithms, and as a shared library takes a call half a millisecond.
#define OPENSSL_SUPPRESS_DEPRECATED

#include "platform/sharing/module/SecretHash.h"

#include <openssl/sha.h>

namespace QELO::Platform {

std::string secretHash(std::string_view secret) {
  unsigned char hash[SHA256_DIGEST_LENGTH];
  SHA256_CTX context;
  SHA256_Init(&context);
  SHA256_Update(&context, secret.data(), secret.size());
  SHA256_Final(hash, &context);
  return {reinterpret_cast<const char*>(hash), sizeof hash};
}

}  // namespace QELO::Platform
