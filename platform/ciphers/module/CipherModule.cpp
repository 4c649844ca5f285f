#include "platform/ciphers/module/CipherModule.h"

#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/kdf.h>
#include <openssl/params.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/rsa.h>

#include <algorithm>
#include <cstdint>
#include <memory>
#include <utility>
#include <vector>

#include "webapi/Export.h"

namespace QELO::Platform {
namespace {

constexpr int kLeastBits = 2048;
constexpr size_t kHalfKey = 32;  ///< bytes: the first half authenticates, the second enciphers
constexpr size_t kTagSize = 32;  ///< of the 64 that HMAC with SHA-512 gives
constexpr char kContentInfo[] = "webapi parameter cipher";
constexpr char kKeyInfo[] = "webapi parameter key";
constexpr size_t kSecretSize = 32;
constexpr size_t kKeyTextBytes = 24;  ///< a multiple of three: as base64url without a rest

using Bytes = std::vector<unsigned char>;

struct Free {
  void operator()(BIO* bio) const { BIO_free(bio); }
  void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
  void operator()(EVP_PKEY_CTX* context) const { EVP_PKEY_CTX_free(context); }
  void operator()(EVP_CIPHER_CTX* context) const { EVP_CIPHER_CTX_free(context); }
  void operator()(EVP_MAC* mac) const { EVP_MAC_free(mac); }
  void operator()(EVP_MAC_CTX* context) const { EVP_MAC_CTX_free(context); }
  void operator()(EVP_KDF* kdf) const { EVP_KDF_free(kdf); }
  void operator()(EVP_KDF_CTX* context) const { EVP_KDF_CTX_free(context); }
};
template <typename T>
using Owned = std::unique_ptr<T, Free>;

const unsigned char* bytesOf(const std::string& text) {
  return reinterpret_cast<const unsigned char*>(text.data());
}

/// What authenticates: header, vector, text, and the header's length in bits.
bool computeTag(const CipherText& envelope, const Bytes& key, unsigned char* tag) {
  const Owned<EVP_MAC> mac(EVP_MAC_fetch(nullptr, "HMAC", nullptr));
  const Owned<EVP_MAC_CTX> context(mac != nullptr ? EVP_MAC_CTX_new(mac.get()) : nullptr);
  char digest[] = "SHA512";
  const OSSL_PARAM params[] = {OSSL_PARAM_construct_utf8_string("digest", digest, 0),
                               OSSL_PARAM_construct_end()};
  unsigned char length[8];
  for (unsigned i = 0; i < sizeof length; ++i) {
    length[i] = static_cast<unsigned char>(uint64_t{envelope.header.size()} * 8 >> (56 - 8 * i));
  }
  unsigned char whole[2 * kTagSize];
  size_t size = 0;
  const auto add = [&](const std::string& text) {
    return EVP_MAC_update(context.get(), bytesOf(text), text.size()) == 1;
  };
  if (context == nullptr || EVP_MAC_init(context.get(), key.data(), kHalfKey, params) != 1 ||
      !add(envelope.header) || !add(envelope.iv) || !add(envelope.text) ||
      EVP_MAC_update(context.get(), length, sizeof length) != 1 ||
      EVP_MAC_final(context.get(), whole, &size, sizeof whole) != 1 || size != sizeof whole) {
    return false;
  }
  std::copy(whole, whole + kTagSize, tag);
  return true;
}

bool decipher(const CipherText& envelope, const Bytes& key, std::string& plain) {
  const Owned<EVP_CIPHER_CTX> context(EVP_CIPHER_CTX_new());
  std::string text(envelope.text.size() + EVP_MAX_BLOCK_LENGTH, '\0');
  auto* out = reinterpret_cast<unsigned char*>(text.data());
  int count = 0;
  int last = 0;
  if (context == nullptr ||
      EVP_DecryptInit_ex(context.get(), EVP_aes_256_cbc(), nullptr, key.data() + kHalfKey,
                         bytesOf(envelope.iv)) != 1 ||
      EVP_DecryptUpdate(context.get(), out, &count, bytesOf(envelope.text),
                        static_cast<int>(envelope.text.size())) != 1 ||
      EVP_DecryptFinal_ex(context.get(), out + count, &last) != 1) {
    return false;
  }
  text.resize(static_cast<size_t>(count + last));
  plain.swap(text);
  return true;
}

/// Nothing is deciphered before all of it is proved.
bool open(const CipherText& envelope, const Bytes& key, std::string& plain) {
  unsigned char tag[kTagSize];
  return key.size() == 2 * kHalfKey && envelope.tag.size() == kTagSize &&
         computeTag(envelope, key, tag) && CRYPTO_memcmp(tag, envelope.tag.data(), kTagSize) == 0 &&
         decipher(envelope, key, plain);
}

/// @return null when it is of no use
Owned<EVP_PKEY> readPrivateKey(const std::string& pem) {
  const Owned<BIO> bio(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
  Owned<EVP_PKEY> rsa(bio != nullptr ? PEM_read_bio_PrivateKey(bio.get(), nullptr, nullptr, nullptr)
                                     : nullptr);
  return rsa != nullptr && EVP_PKEY_get_base_id(rsa.get()) == EVP_PKEY_RSA &&
                 EVP_PKEY_get_bits(rsa.get()) >= kLeastBits
             ? std::move(rsa)
             : nullptr;
}

/// @return false when the private key is of no use. A content key that cannot be deciphered becomes
/// a random one: its sender must not learn what was wrong with it.
bool readContentKey(const std::string& pem, const std::string& enciphered, Bytes& key) {
  const Owned<EVP_PKEY> rsa = readPrivateKey(pem);
  if (rsa == nullptr) {
    return false;
  }
  const Owned<EVP_PKEY_CTX> context(EVP_PKEY_CTX_new(rsa.get(), nullptr));
  if (context == nullptr || EVP_PKEY_decrypt_init(context.get()) != 1 ||
      EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_OAEP_PADDING) != 1 ||
      EVP_PKEY_CTX_set_rsa_oaep_md(context.get(), EVP_sha256()) != 1 ||
      EVP_PKEY_CTX_set_rsa_mgf1_md(context.get(), EVP_sha256()) != 1) {
    return false;
  }
  Bytes random(2 * kHalfKey);
  if (RAND_bytes(random.data(), static_cast<int>(random.size())) != 1) {
    return false;
  }
  Bytes found(static_cast<size_t>(EVP_PKEY_get_size(rsa.get())));
  size_t size = found.size();
  const bool good = EVP_PKEY_decrypt(context.get(), found.data(), &size, bytesOf(enciphered),
                                     enciphered.size()) == 1;
  found.resize(2 * kHalfKey);
  key = good && size == 2 * kHalfKey ? found : random;
  return true;
}

/// HKDF without salt.
/// @param size  bytes to derive
bool derive(const char* digestName, std::string secret, std::string info, size_t size, Bytes& key) {
  const Owned<EVP_KDF> kdf(EVP_KDF_fetch(nullptr, "HKDF", nullptr));
  const Owned<EVP_KDF_CTX> context(kdf != nullptr ? EVP_KDF_CTX_new(kdf.get()) : nullptr);
  std::string digest = digestName;
  const OSSL_PARAM params[] = {
      OSSL_PARAM_construct_utf8_string("digest", digest.data(), 0),
      OSSL_PARAM_construct_octet_string("key", secret.data(), secret.size()),
      OSSL_PARAM_construct_octet_string("info", info.data(), info.size()),
      OSSL_PARAM_construct_end()};
  key.resize(size);
  return context != nullptr && EVP_KDF_derive(context.get(), key.data(), size, params) == 1;
}

}  // namespace
}  // namespace QELO::Platform

using namespace QELO::Platform;

extern "C" WEBAPI_API bool webapiOpenByPrivateKey(const std::string& pem,
                                                  const CipherText& envelope, std::string* plain) {
  Bytes key;
  return readContentKey(pem, envelope.key, key) && open(envelope, key, *plain);
}

extern "C" WEBAPI_API bool webapiFindPublicKey(const std::string& pem, std::string* publicPem) {
  const Owned<EVP_PKEY> rsa = readPrivateKey(pem);
  const Owned<BIO> written(BIO_new(BIO_s_mem()));
  char* text = nullptr;
  if (rsa == nullptr || written == nullptr || PEM_write_bio_PUBKEY(written.get(), rsa.get()) != 1) {
    return false;
  }
  const long size = BIO_get_mem_data(written.get(), &text);
  publicPem->assign(text, static_cast<size_t>(size));
  return true;
}

extern "C" WEBAPI_API bool webapiOpenByKeyText(const std::string& keyText,
                                               const CipherText& envelope, std::string* plain) {
  Bytes key;
  return envelope.key.empty() && !keyText.empty() &&
         derive("SHA512", keyText, kContentInfo, 2 * kHalfKey, key) && open(envelope, key, *plain);
}

extern "C" WEBAPI_API bool webapiDeriveKeyText(const unsigned char* secret, std::string* text) {
  Bytes key;
  const std::string bytes(reinterpret_cast<const char*>(secret), kSecretSize);
  if (!derive("SHA256", bytes, kKeyInfo, kKeyTextBytes, key)) {
    return false;
  }
  unsigned char encoded[kKeyTextBytes * 4 / 3 + 1];
  EVP_EncodeBlock(encoded, key.data(), kKeyTextBytes);
  text->assign(reinterpret_cast<const char*>(encoded), sizeof encoded - 1);
  std::replace(text->begin(), text->end(), '+', '-');
  std::replace(text->begin(), text->end(), '/', '_');
  return true;
}
