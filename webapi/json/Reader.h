#pragma once

#include <json/json.h>

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "webapi/JsonHelper.h"

namespace QELO::JsonHelper {

/// How a text is read.
struct Reading {
  /// For files that people write: a byte order mark at the front and comments of both kinds are
  /// accepted.
  bool comments = false;
  bool keepDigits = false;      ///< a number that would lose digits (readNumber) is none
  int maxDepth = kMaxDepth;     ///< deepest nesting of arrays and objects that is accepted
  size_t maxValues = SIZE_MAX;  ///< most values, nested ones counted, that are built
};

enum class ReadResult {
  kRead,
  kNoJson,   ///< or a number too large for a real, or half of a surrogate pair
  kTooMany,  ///< more values than allowed; what follows them was not looked at
};

/// Reads a text that is one JSON value (RFC 8259) with nothing but blanks around it.
///
/// The JSON library's readers are no match for it. Whatever their settings, they let through "-"
/// and "01" as numbers, raw control characters in strings, and anything behind a NUL; and what they
/// cost at the first use is a thirtieth of a CGI process.
///
/// @param value   receives the value; undefined when the text is refused
/// @param values  unless null, receives the number of values that were counted
ReadResult readJsonText(std::string_view text, const Reading& how, Json::Value& value,
                        size_t* values = nullptr);

/// How many bytes of a text could be the beginning of one that readJsonText() takes; npos when it
/// takes all of it.
size_t jsonTextFault(std::string_view text, const Reading& how);

}  // namespace QELO::JsonHelper
