#pragma once

#include <json/json.h>

#include <cstdint>
#include <string>
#include <string_view>

#include "webapi/Export.h"

/// Conversions and text forms of JSON values that never throw.
///
/// The JSON library throws when a value is asked for a type that it does not hold, when a
/// string or an array is asked for a member, and when a text nests deeply. Values come from
/// clients, files and other processes, so all code reads them through this header.
namespace QELO::JsonHelper {

/// Deepest nesting of arrays and objects that a text may have; deeper text is refused. The JSON
/// library parses, copies and frees recursively, so the limit guards the stack.
inline constexpr int kMaxDepth = 256;

/// Compact JSON text, UTF-8 as it is, without a newline at the end.
WEBAPI_API std::string toString(const Json::Value& value);

/// Parses one JSON text: any value, with nothing but blanks around it.
/// @return false, and `value` unchanged, when the text is not JSON, holds more after the value,
///         or nests deeper than kMaxDepth.
WEBAPI_API bool fromString(const std::string& text, Json::Value& value);

/// Reads a file of JSON text; comments are accepted.
/// @return false, and `value` unchanged, when the file cannot be read whole or is not JSON.
WEBAPI_API bool fromFile(const std::string& path, Json::Value& value);

/// Replaces the file by the value's text: readers see the old or the new content, never a part,
/// and a failure leaves the old file. The file keeps the mode of the one replaced, else 0600.
WEBAPI_API bool toFile(const std::string& path, const Json::Value& value);

/// The member `key`, or null when `value` is no object or has no such member. It lives as long as
/// `value` is unchanged.
WEBAPI_API const Json::Value* find(const Json::Value& value, std::string_view key);

/// The member `key`, or a null value when `value` is no object or has no such member. The
/// reference lives as long as `value` is unchanged.
WEBAPI_API const Json::Value& member(const Json::Value& value, std::string_view key);

/// Whether `value` is an object that has the member `key`, be it null.
WEBAPI_API bool hasMember(const Json::Value& value, std::string_view key);

/// Whether `value` is the string `text`.
WEBAPI_API bool isText(const Json::Value& value, std::string_view text);

/// Text form: a string as it is, numbers and booleans as JSON writes them, null as ""; an array
/// or object gives `fallback`.
WEBAPI_API std::string asString(const Json::Value& value, const std::string& fallback = "");

/// Integer form: a number within range (a fraction is cut off), a boolean as 0 or 1, or a string
/// that is a decimal number as a whole; all else, also out of range, gives `fallback`.
WEBAPI_API int asInt(const Json::Value& value, int fallback = 0);
WEBAPI_API int64_t asInt64(const Json::Value& value, int64_t fallback = 0);
WEBAPI_API uint64_t asUInt64(const Json::Value& value, uint64_t fallback = 0);

/// Truth: a boolean as it is, a number other than 0; null and all else give `fallback`.
WEBAPI_API bool asBool(const Json::Value& value, bool fallback = false);

/// The text as JSON can hold it: bytes that are no part of valid UTF-8 become U+FFFD. Names of
/// files are any bytes.
WEBAPI_API std::string repairUtf8(const std::string& text);

}  // namespace QELO::JsonHelper
