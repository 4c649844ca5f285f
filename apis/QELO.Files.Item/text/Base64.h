#pragma once

#include <string>
#include <string_view>

namespace files {

/// @param bytes  unchanged when the text is no base64 (RFC 4648, with or without "=" at the end)
bool decodeBase64(std::string_view text, std::string& bytes);

}  // namespace files
