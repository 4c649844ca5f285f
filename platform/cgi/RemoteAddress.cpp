#include "platform/cgi/RemoteAddress.h"

#include <cstdlib>
#include <string_view>

#include "platform/base/TextBuffer.h"
#include "webapi/platform/Cgi.h"

namespace QELO::Platform {
namespace {

std::string environment(const char* name) {
  const char* value = getenv(name);
  return value != nullptr ? value : "";
}

/// Takes the last piece of a list off; `separators` and blanks stand between the pieces.
std::string takeLast(std::string& list, const char* separators) {
  const size_t last = list.find_last_not_of(separators);
  if (last == std::string::npos) {
    list.clear();
    return {};
  }
  const size_t before = list.find_last_of(separators, last);
  const size_t first = before == std::string::npos ? 0 : before + 1;
  std::string piece = list.substr(first, last - first + 1);
  list.resize(first);
  return piece;
}

bool isTrusted(const IpAddress& address, std::string networks) {
  while (!networks.empty()) {
    bool valid = false;
    if (address.IsIn(takeLast(networks, ", \t"), valid)) {
      return true;
    }
  }
  return false;
}

enum class Header { kAbsent, kGood, kBroken };

/// The client's address by X-Real-IP. A proxy's own address says nothing: it is the proxy behind.
Header readRealAddress(const std::string& networks, IpAddress& address) {
  const std::string text = environment("HTTP_X_REAL_IP");
  IpAddress found;
  if (text.empty()) {
    return Header::kAbsent;
  }
  if (!IpAddress::Parse(text, found)) {
    return Header::kBroken;
  }
  if (isTrusted(found, networks)) {
    return Header::kAbsent;
  }
  address = found;
  return Header::kGood;
}

/// The client's address by X-Forwarded-For: the last that is no trusted proxy. What stands before
/// it was written by the client.
Header readForwardedAddress(const std::string& networks, IpAddress& address) {
  std::string list = environment("HTTP_X_FORWARDED_FOR");
  IpAddress found;
  for (std::string piece; !(piece = takeLast(list, ", \t")).empty();) {
    if (!IpAddress::Parse(piece, found)) {
      return Header::kBroken;
    }
    if (!isTrusted(found, networks)) {
      address = found;
      return Header::kGood;
    }
  }
  return Header::kAbsent;
}

}  // namespace

bool findRemoteAddress(const Settings& settings, IpAddress& address) {
  IpAddress peer;
  if (!IpAddress::Parse(environment("REMOTE_ADDR"), peer)) {
    return false;
  }
  const std::string networks = settings.Get("trusted_proxy", "");
  if (!isTrusted(peer, networks)) {
    address = peer;
    return true;
  }
  IpAddress real = peer;
  IpAddress forwarded = peer;
  const Header hasReal = readRealAddress(networks, real);
  const Header hasForwarded = readForwardedAddress(networks, forwarded);
  if (hasReal == Header::kBroken || hasForwarded == Header::kBroken) {
    return false;
  }
  // A proxy that writes one of the two passes the client's own text in the other on.
  if (hasReal == Header::kGood && hasForwarded == Header::kGood && !(real == forwarded)) {
    return false;
  }
  address = hasReal == Header::kGood ? real : forwarded;
  return true;
}

}  // namespace QELO::Platform

extern "C" int QeloCgiGetRemoteIP(char* address, int size) {
  using namespace QELO::Platform;
  IpAddress found;
  const bool known = findRemoteAddress(Settings(), found);
  return fillBuffer(known ? found.Text() : "", address, size) && known ? 0 : -1;
}
