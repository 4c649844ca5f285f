#pragma once

#include <string>
#include <string_view>

#include "webapi/base/Text.h"

namespace QELO {

inline constexpr char kLowerHex[] = "0123456789abcdef";
inline constexpr char kUpperHex[] = "0123456789ABCDEF";

/// Adds a byte's two digits to a text.
/// @param digits  kLowerHex or kUpperHex
inline void AppendHex(unsigned char byte, const char* digits, std::string& text) {
  text += digits[byte >> 4U];
  text += digits[byte & 15U];
}

/// All bytes in lower-case digits.
inline std::string HexText(std::string_view bytes) {
  std::string text;
  text.reserve(2 * bytes.size());
  for (const char byte : bytes) {
    AppendHex(static_cast<unsigned char>(byte), kLowerHex, text);
  }
  return text;
}

/// The value of a digit of either case, -1 when it is none.
constexpr int HexValue(char c) {
  const char lower = static_cast<char>(c | 0x20);
  return IsDigit(c) ? c - '0' : lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

}  // namespace QELO
