#pragma once

#include <string_view>

namespace QELO::JsonHelper {

/// Some editors put it before a file's text.
inline constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

/// Whether a text is one JSON value (RFC 8259) with nothing but blanks around it.
///
/// Needed because the JSON library lets through, whatever its settings: "-" and "01" as numbers,
/// raw control characters in strings, and anything behind a NUL.
///
/// @param comments  for files that people write: a byte order mark at the front and comments
///                  of both kinds are accepted
/// @param maxDepth  deepest nesting of arrays and objects that is accepted
bool isJsonText(std::string_view text, bool comments, int maxDepth);

}  // namespace QELO::JsonHelper
