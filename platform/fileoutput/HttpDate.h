#pragma once

#include <ctime>
#include <string>
#include <string_view>

namespace QELO::Platform {

/// A time as HTTP writes it, "Sun, 06 Nov 1994 08:49:37 GMT", whatever the locale.
/// @return "" outside of the years 1 to 9999
std::string formatHttpDate(time_t time);

/// Reads each of the three forms that HTTP has.
/// @return false, and `time` unchanged, when the text is none
bool parseHttpDate(std::string_view text, time_t& time);

}  // namespace QELO::Platform
