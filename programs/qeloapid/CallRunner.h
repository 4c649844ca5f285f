#pragma once

#include <json/json.h>

#include <string>

#include "programs/server/Note.h"
#include "webapi/APIRunner.h"

namespace QELO {

/// Makes the call that a front has sent: as in process, but that permission was asked and the
/// upload taken by the front.
class CallRunner : public APIRunner {
 public:
  /// @param message  taken apart
  /// @param socket   the path that the message came to: an API with another "socket" is not served,
  ///                 and its call answers 102
  /// @param note     receives what is called and the answer's code
  /// @return the answer's text; "" when the message holds no call
  std::string Answer(Json::Value& message, const std::string& socket, Note& note);
};

}  // namespace QELO
