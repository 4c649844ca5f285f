#include "platform/base/IpAddress.h"

#include <arpa/inet.h>

#include <cstring>
#include <string_view>

#include "webapi/base/Hex.h"
#include "webapi/base/Number.h"

namespace QELO::Platform {
namespace {

constexpr int kV4Offset = 12;  // of an IPv4 address in its IPv6 form
constexpr int kV4Bits = 32;
constexpr int kV6Bits = 128;

bool sameBits(const in6_addr& left, const in6_addr& right, int bits) {
  const int bytes = bits / 8;
  if (memcmp(left.s6_addr, right.s6_addr, static_cast<size_t>(bytes)) != 0) {
    return false;
  }
  const unsigned rest = static_cast<unsigned>(bits) % 8;
  const unsigned mask = 0xFF00U >> rest & 0xFFU;
  return rest == 0 || ((left.s6_addr[bytes] ^ right.s6_addr[bytes]) & mask) == 0;
}

}  // namespace

bool IpAddress::Parse(const std::string& text, IpAddress& address) {
  const std::string plain = text.substr(0, text.find('%'));
  if (plain.size() != strlen(plain.c_str())) {
    return false;
  }
  in6_addr bytes{};
  if (inet_pton(AF_INET6, plain.c_str(), &bytes) != 1) {
    if (inet_pton(AF_INET, plain.c_str(), &bytes.s6_addr[kV4Offset]) != 1) {
      return false;
    }
    bytes.s6_addr[kV4Offset - 2] = bytes.s6_addr[kV4Offset - 1] = 0xFF;
  }
  address.bytes_ = bytes;
  return true;
}

bool IpAddress::operator==(const IpAddress& other) const {
  return sameBits(bytes_, other.bytes_, kV6Bits);
}

std::string IpAddress::Text() const {
  char text[INET6_ADDRSTRLEN] = "";
  if (IsV4()) {
    inet_ntop(AF_INET, &bytes_.s6_addr[kV4Offset], text, sizeof text);
  } else {
    inet_ntop(AF_INET6, &bytes_, text, sizeof text);
  }
  return text;
}

std::string IpAddress::NetworkHex() const {
  const auto* bytes = reinterpret_cast<const char*>(bytes_.s6_addr);
  return HexText(IsV4() ? std::string_view(bytes + kV4Offset, 4) : std::string_view(bytes, 8));
}

bool IpAddress::IsIn(const std::string& network, bool& valid) const {
  const size_t slash = network.find('/');
  IpAddress base;
  valid = Parse(network.substr(0, slash), base);
  if (!valid) {
    return false;
  }
  const int most = base.IsV4() ? kV4Bits : kV6Bits;
  int bits = most;
  if (slash != std::string::npos) {
    valid =
        ParseNumber(std::string_view(network).substr(slash + 1), bits) && bits >= 0 && bits <= most;
  }
  const int ignored = most - bits;
  return valid && IsV4() == base.IsV4() && sameBits(bytes_, base.bytes_, kV6Bits - ignored);
}

}  // namespace QELO::Platform
