#pragma once

#include <string_view>

namespace QELO::Platform {

/// Fills a caller's buffer with a text and a NUL.
/// @return false, and an empty text where there is room for one, when it does not fit whole: a name
///         cut short would be another's name
inline bool fillBuffer(std::string_view text, char* buffer, int size) {
  if (buffer == nullptr || size <= 0) {
    return false;
  }
  const bool fits = text.size() < static_cast<size_t>(size);
  const size_t length = fits ? text.copy(buffer, text.size()) : 0;
  buffer[length] = '\0';
  return fits;
}

}  // namespace QELO::Platform
