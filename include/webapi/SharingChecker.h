#pragma once

#include <json/json.h>

#include "webapi/Export.h"
#include "webapi/WebEntry.h"

namespace QELO {

/// Asks nothing but the sharing check library of the link that a CGI request came by: for programs
/// that serve such a request without an API, and have checked the link themselves. Run once, then
/// destroy.
class WEBAPI_API SharingChecker : public WebEntry {
 public:
  /// Takes the request in, as WebEntry does, and asks the library. The argument is not consulted.
  /// Prints nothing.
  /// @return whether the link's application allows the call; false too when the request cannot be
  ///         read
  bool Run(const Json::Value& param) override;
};

}  // namespace QELO
