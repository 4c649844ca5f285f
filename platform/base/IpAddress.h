#pragma once

#include <netinet/in.h>

#include <string>

namespace QELO::Platform {

/// An IPv4 or IPv6 address. An IPv4 address in IPv6 form ("::ffff:192.0.2.1") is that IPv4 address;
/// an interface name ("fe80::1%eth0") is left out.
class IpAddress {
 public:
  /// @return false, and `address` unchanged, when the text is no address
  static bool Parse(const std::string& text, IpAddress& address);

  bool operator==(const IpAddress& other) const;
  bool IsV4() const { return IN6_IS_ADDR_V4MAPPED(&bytes_); }
  /// The usual short form.
  std::string Text() const;
  /// The bytes that one customer is given as lower-case hexadecimal digits: an IPv4 address whole,
  /// of an IPv6 address the 64 bits of the network.
  std::string NetworkHex() const;
  /// Whether the address lies in "address" or "address/bits". An IPv6 network holds no IPv4
  /// address.
  /// @param valid  receives whether the text is a network
  bool IsIn(const std::string& network, bool& valid) const;

 private:
  in6_addr bytes_{};
};

}  // namespace QELO::Platform
