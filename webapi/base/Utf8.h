#pragma once

#include <string>

namespace QELO {

/// The text with every byte that is no part of valid UTF-8 (RFC 3629) replaced by U+FFFD.
std::string RepairUtf8(const std::string& text);

}  // namespace QELO
