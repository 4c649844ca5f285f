#pragma once

#include <string>
#include <string_view>

#include "webapi/base/Hex.h"

namespace QELO::Platform {

/// Decodes %XX; a malformed escape stays as it is.
/// @param plusIsBlank  "+" means a blank
/// @param decoded      the decoded text is added to it
/// @return false when there was a malformed escape
inline bool decodePercent(std::string_view text, bool plusIsBlank, std::string& decoded) {
  const auto digit = [&text](size_t at) { return at < text.size() ? HexValue(text[at]) : -1; };
  bool good = true;
  decoded.reserve(decoded.size() + text.size());
  for (size_t i = 0; i < text.size(); ++i) {
    const int high = text[i] == '%' ? digit(i + 1) : -1;
    const int low = high >= 0 ? digit(i + 2) : -1;
    if (low >= 0) {
      decoded += static_cast<char>(high * 16 + low);
      i += 2;
    } else {
      good = good && text[i] != '%';
      decoded += plusIsBlank && text[i] == '+' ? ' ' : text[i];
    }
  }
  return good;
}

}  // namespace QELO::Platform
