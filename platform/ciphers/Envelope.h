#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/ciphers/module/CipherModule.h"

namespace QELO::Platform {

/// An envelope as it came: JSON Web Encryption in its compact form (RFC 7516), of one content
/// cipher, A256CBC-HS512 (RFC 7518, 5.2).
struct Envelope {
  CipherText parts;
  std::string algorithm;  ///< how the key travels: "RSA-OAEP-256" or "dir"
  int64_t made = 0;       ///< seconds since the epoch, by its maker's clock
};

/// Takes an envelope apart; nothing of it is proved yet. Each text has one form alone: what a
/// lenient reader would overlook, another character or member, makes it none.
/// @return false, and `envelope` unchanged, when it is none
bool readEnvelope(std::string_view text, Envelope& envelope);

}  // namespace QELO::Platform
