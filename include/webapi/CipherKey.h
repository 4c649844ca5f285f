#pragma once

#include <string>

#include "webapi/Export.h"

namespace QELO {

/// The key that clients encipher parameters for.
class WEBAPI_API CipherKey {
 public:
  /// The public half of the host's key, which is no secret. Needs the rights of the account that
  /// owns the private one.
  /// @param pem  receives it as PEM; unchanged on failure
  /// @return false when the host has no key that is of use (logged)
  static bool GetPublic(std::string& pem);
};

}  // namespace QELO
