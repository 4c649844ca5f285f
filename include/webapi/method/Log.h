#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace QELO::method {

/// Text for a log line: what a client may have chosen is cut, and has no control characters.
inline std::string LogText(std::string_view text) {
  constexpr size_t kLongest = 512;
  std::string shown(text.substr(0, kLongest));
  for (char& c : shown) {
    const auto byte = static_cast<unsigned char>(c);
    c = byte < 0x20 || byte == 0x7F ? '?' : c;
  }
  return shown;
}

}  // namespace QELO::method
