#pragma once

#include <string>

/// What the module of ciphers offers to the platform, which loads it.
namespace QELO::Platform {

/// The parts of an envelope.
struct CipherText {
  std::string header;  ///< as it was sent; all the others are decoded
  std::string key;     ///< enciphered content key; "" when it does not travel
  std::string iv;      ///< 16 bytes
  std::string text;
  std::string tag;  ///< 32 bytes
};

/// Opens an envelope whose content key was enciphered for an RSA key, OAEP with SHA-256.
/// @param pem    the private key, 2,048 bits at least
/// @param plain  receives the content; unchanged on failure
/// @return false when the key is of no use or the envelope is not what was made with it
using OpenByPrivateKey = bool (*)(const std::string& pem, const CipherText& envelope,
                                  std::string* plain);
/// Opens an envelope whose content key both sides derive from a text, by HKDF with SHA-512.
using OpenByKeyText = bool (*)(const std::string& keyText, const CipherText& envelope,
                               std::string* plain);
/// The public half of a private key that OpenByPrivateKey takes.
/// @param publicPem  receives it; unchanged on failure
/// @return false when the key is of no use
using FindPublicKey = bool (*)(const std::string& pem, std::string* publicPem);
/// The text that stands for a secret of 32 bytes as a key: 32 characters, 24 bytes of HKDF with
/// SHA-256 as base64url.
/// @param text  receives it
using DeriveKeyText = bool (*)(const unsigned char* secret, std::string* text);

inline constexpr char kCipherModule[] = "ciphers.so";
inline constexpr char kOpenByPrivateKey[] = "webapiOpenByPrivateKey";
inline constexpr char kFindPublicKey[] = "webapiFindPublicKey";
inline constexpr char kOpenByKeyText[] = "webapiOpenByKeyText";
inline constexpr char kDeriveKeyText[] = "webapiDeriveKeyText";

}  // namespace QELO::Platform
