#pragma once

#include <json/json.h>

#include <cstddef>
#include <string_view>

namespace QELO::JsonHelper {

/// Reads a text that is one JSON value (RFC 8259) with nothing but blanks around it.
///
/// The JSON library's readers are no match for it. Whatever their settings, they let through "-"
/// and "01" as numbers, raw control characters in strings, and anything behind a NUL; and what they
/// cost at the first use is a thirtieth of a CGI process.
///
/// Integers within 32 bits are signed, larger ones unsigned where they are not negative, as the
/// JSON library has them; beyond 64 bits they are reals.
///
/// @param comments  for files that people write: a byte order mark at the front and comments
///                  of both kinds are accepted
/// @param maxDepth  deepest nesting of arrays and objects that is accepted
/// @param value     receives the value; undefined when the text is refused
/// @return false when the text is none, or holds a number too large for a real, or half of a
///         surrogate pair
bool readJsonText(std::string_view text, bool comments, int maxDepth, Json::Value& value);

/// How many bytes of a text could be the beginning of one that readJsonText() takes; npos when it
/// takes all of it.
size_t jsonTextFault(std::string_view text, bool comments, int maxDepth);

}  // namespace QELO::JsonHelper
