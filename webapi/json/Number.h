#pragma once

#include <json/json.h>

namespace QELO::JsonHelper {

/// Takes the number at the front of a text off it, by JSON's grammar (RFC 8259).
///
/// Integers within 32 bits are signed, larger ones unsigned where they are not negative, as the
/// JSON library has them; beyond 64 bits they are reals.
///
/// @param keepDigits  a number is refused when it would lose digits: an integer beyond 64 bits,
/// "-0",
///                    and a real whose shortest form that reads back as the same number has another
///                    value than the text, unless the real is exactly what the text says
/// @param at  on failure: behind what could be the beginning of a number
/// @return false when there is no number, or one that is too large
bool readNumber(const char*& at, const char* end, bool keepDigits, Json::Value& value);

}  // namespace QELO::JsonHelper
