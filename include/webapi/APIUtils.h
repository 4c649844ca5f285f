#pragma once

#include <string>

#include "webapi/Export.h"

namespace QELO {

/// Small services for programs that call web APIs from code.
class WEBAPI_API APIUtils {
 public:
  /// Writes one key of the system information file, /etc/qeloinfo.conf, as root for the time of
  /// writing.
  /// @return false when root is not to be had (logged to the authorisation facility) or the file
  ///         was not written
  static bool SetQeloInfo(const std::string& key, const std::string& value);
};

}  // namespace QELO
