// Checksums by OpenSSL, a library of its own: see Digest.h.

#include <openssl/evp.h>

#include <cstring>
#include <memory>

#include "transfer/Digest.h"

namespace files {
namespace {

struct Free {
  void operator()(EVP_MD_CTX* context) const { EVP_MD_CTX_free(context); }
};

class OpenSslDigest : public Digest {
 public:
  bool Open(const EVP_MD* algorithm) {
    return context_ != nullptr && EVP_DigestInit_ex(context_.get(), algorithm, nullptr) == 1;
  }
  void Add(const char* data, size_t size) override { EVP_DigestUpdate(context_.get(), data, size); }
  std::string Finish() override {
    unsigned char bytes[EVP_MAX_MD_SIZE];
    unsigned size = 0;
    EVP_DigestFinal_ex(context_.get(), bytes, &size);
    return {reinterpret_cast<const char*>(bytes), size};
  }

 private:
  std::unique_ptr<EVP_MD_CTX, Free> context_{EVP_MD_CTX_new()};
};

}  // namespace
}  // namespace files

extern "C" __attribute__((visibility("default"))) files::Digest* QeloFilesMakeDigest(
    const char* algorithm) {
  const EVP_MD* known = strcmp(algorithm, "sha1") == 0     ? EVP_sha1()
                        : strcmp(algorithm, "sha256") == 0 ? EVP_sha256()
                                                           : nullptr;
  auto digest = std::make_unique<files::OpenSslDigest>();
  return known != nullptr && digest->Open(known) ? digest.release() : nullptr;
}
