#pragma once

#include <json/json.h>

namespace QELO {

class APIRequest;
class APIResponse;
class CredRequestMgr;

/// Forwards a call to another host and prints that host's answer.
class Relay {
 public:
  /// @param request   checked and permitted, with "relay_zt"
  /// @param response  receives error 109 on failure
  Relay(APIRequest& request, APIResponse& response) : request_(request), response_(response) {}

  /// Queues and performs the call.
  /// @param answer  receives the other host's answer as it came
  /// @return false on failure, with the error set
  bool Ask(CredRequestMgr& manager, std::string& answer);

 private:
  int Queue(CredRequestMgr& manager, long host, const Json::Value& params);

  APIRequest& request_;
  APIResponse& response_;
};

}  // namespace QELO
