#pragma once

#include <json/json.h>

#include <string>

namespace QELO {

class APIRequest;
class APIResponse;
class APIRunner;

/// One call that an API daemon makes: the road that the description's "socket" opens.
///
/// The request and the response as prepared so far go to the daemon as one message, and the filled
/// response comes back. The daemon takes the credentials and the priority; nothing of this process
/// changes.
class DaemonCall {
 public:
  /// @param request  with its API's description
  DaemonCall(APIRunner& runner, APIRequest* request);

  /// Whether the call goes to a daemon: never from within one, and not without a socket that is
  /// there (logged), where the description turns it off, for a download, and for an upload that the
  /// method reads itself.
  bool IsPossible();

  /// Makes the call, which is permitted and whose upload is taken.
  /// @return false, logged, and the response with error 117, when the daemon could not be asked or
  ///         gave no answer
  bool Run(APIResponse* response);

 private:
  bool Exchange(APIResponse* response, std::string& answer);

  APIRunner& runner_;
  APIRequest* request_;
  const std::string path_;
};

}  // namespace QELO
