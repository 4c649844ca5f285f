#pragma once

#include "webapi/Export.h"

/// The host's library for names and addresses of the network.
extern "C" {

/// Whether a text is the name of a host: labels of 1 to 63 letters, digits and inner hyphens with
/// dots between them, 253 characters in all (RFC 952, RFC 1123). A label that begins with "xn--" is
/// the ASCII form of an internationalised one (RFC 5891) and holds what Punycode can decode. The
/// last label is not all digits, and the whole nothing that inet_aton() takes for an address.
/// @return 1 yes, 0 no
WEBAPI_API int BlQLIBIsHostname(const char* text);
/// Whether a text is the name of a domain: as a host's, and it may end with one dot, as names that
/// are told from the root on do (RFC 1034). One label will do.
/// @return 1 yes, 0 no
WEBAPI_API int BlQLIBIsDomain(const char* text);
/// What kind of address a text is, as inet_pton() reads it. An interface ("fe80::1%eth0") is no
/// part of an address and makes the text none: whether it is one would depend on the host's
/// interfaces.
/// @return AF_INET (2), AF_INET6 (10, also for "::ffff:192.0.2.1"), or 0 for no address
WEBAPI_API int QELONetGetAddrType(const char* text);

}  // extern "C"
