#pragma once

#include <string_view>

namespace QELO::Platform {

/// Whether a text is what Punycode (RFC 3492) makes of a text with at least one character that is
/// not ASCII.
bool isPunycode(std::string_view text);

}  // namespace QELO::Platform
