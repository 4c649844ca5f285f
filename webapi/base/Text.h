#pragma once

#include <string_view>

namespace QELO {

/// The letters and digits of ASCII, whatever the locale.
constexpr bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}
constexpr bool IsAlphanumeric(char c) {
  return IsDigit(c) || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

/// Whether a text can be the name of an application, and so a part of a file's: 1 to 64 letters,
/// digits, "_", "-" and ".", the first none of the last.
constexpr bool IsProjectName(std::string_view text) {
  constexpr size_t kLongest = 64;
  if (text.empty() || text.size() > kLongest || text.front() == '.') {
    return false;
  }
  for (const char c : text) {
    if (!IsAlphanumeric(c) && c != '_' && c != '-' && c != '.') {
      return false;
    }
  }
  return true;
}

/// The text without the blanks around it.
constexpr std::string_view Trim(std::string_view text, std::string_view blanks = " \t") {
  const size_t first = text.find_first_not_of(blanks);
  return first == std::string_view::npos
             ? std::string_view()
             : text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

/// Takes what stands before the first separator off the front of a text, and the separator; the
/// whole text when there is none.
/// @param separator  not empty
constexpr std::string_view TakePiece(std::string_view& rest, std::string_view separator) {
  const size_t end = rest.find(separator);
  const std::string_view piece = rest.substr(0, end);
  rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + separator.size());
  return piece;
}

}  // namespace QELO
