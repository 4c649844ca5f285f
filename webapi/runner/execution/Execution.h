#pragma once

#include <json/json.h>

namespace QELO {

class APIRequest;
class APIResponse;
class APIRunner;

/// One permitted call's method, run from its API library in this process and fenced off from it:
/// standard streams, priority, credentials and working directory are as before when it has ended.
class Execution {
 public:
  /// Whether the method's account is taken for the call, or the process has it for good.
  enum class Account { kWanted, kTaken };

  /// @param runner  opens the library
  Execution(APIRunner& runner, APIRequest* request, APIResponse* response,
            Account account = Account::kWanted)
      : runner_(runner), request_(request), response_(response), account_(account) {}

  /// @param attributes  the method's
  /// @return whether the method was called and returned; else the response has the error that the
  ///         library's check function has set, or 111, 117 or 121
  bool Run(const Json::Value& attributes);

 private:
  APIRunner& runner_;
  APIRequest* request_;
  APIResponse* response_;
  const Account account_;
};

}  // namespace QELO
