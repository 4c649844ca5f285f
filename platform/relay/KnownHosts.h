#pragma once

#include <string>

namespace QELO::Platform {

/// Another host, as /etc/webapi/relay.json has it.
struct RelayHost {
  std::string url;    ///< of its entry.cgi: "https://..." without a query
  std::string token;  ///< an access token of that host
  std::string trust;  ///< file of certificates, the root's prefix included; "": the host's own
  std::string pin;    ///< of its public key; "": none
  long timeout = 0;   ///< seconds for an answer
};

/// @param reason  receives what is wrong on failure
/// @return false when the file holds no such host, or cannot be trusted or understood
bool findRelayHost(long number, RelayHost& host, std::string& reason);

}  // namespace QELO::Platform
