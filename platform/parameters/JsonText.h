#pragma once

#include <json/json.h>

#include <string>

namespace QELO::Platform {

/// The JSON value that a text is as a whole. The text of a number is its JSON value only when no
/// digit gets lost: integers of 64 bits, other numbers of up to 15 significant digits; that goes
/// for the numbers within an array or object too.
/// @return false, and `value` unchanged, when the text is no such JSON text
bool parseJsonText(const std::string& text, Json::Value& value);

}  // namespace QELO::Platform
