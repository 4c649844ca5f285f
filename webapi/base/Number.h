#pragma once

#include <charconv>
#include <string_view>
#include <system_error>

namespace QELO {

/// Reads the decimal number that a text is as a whole: without blanks, "+" or another ending.
/// @return false when the text is none, or no T holds it; `number` is unchanged then
template <typename T>
bool ParseNumber(std::string_view text, T& number) {
  T parsed{};
  const char* end = text.data() + text.size();
  const auto result = std::from_chars(text.data(), end, parsed);
  const bool good = result.ec == std::errc() && result.ptr == end;
  if (good) {
    number = parsed;
  }
  return good;
}

}  // namespace QELO
