#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "webapi/platform/CredRequestError.h"

namespace QELO::Platform {

/// Longest answer in bytes: it is kept in memory until it is printed.
inline constexpr size_t kLongestAnswer = size_t{32} << 20;
/// Longest time for an answer in seconds.
inline constexpr long kLongestTimeout = 3600;

/// One HTTP request to another host, and what came of it.
struct RelayCall {
  std::string url;
  std::vector<std::string> headers;  ///< "Name: value"
  std::string body;                  ///< of a call; an upload has none
  int upload = -1;                   ///< descriptor of an upload's body
  int64_t uploadLength = 0;          ///< its bytes
  std::string trust;                 ///< file of certificates; "": the host's own
  std::string pin;                   ///< of the public key, "sha256//..."; "": none
  long timeout = 0;                  ///< seconds for the answer, above 0

  std::string answer;
  CredRequestError error = CRED_REQUEST_OK;
  std::string reason;  ///< of the failure, for the log
};

/// What the relay's module offers: performs the calls all at once and fills in what came of each.
using RelayRun = void (*)(std::vector<RelayCall>* calls);
inline constexpr char kRelayModule[] = "relay.so";
inline constexpr char kRelayRun[] = "webapiRelayRun";

}  // namespace QELO::Platform
