#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace QELO {

/// Bytes of a client's text that a log line shows. A log may be a slow console, which everybody who
/// logs then waits for.
inline constexpr size_t kLongestLogText = 256;

/// A client's text as a log can show it: control characters, which could begin a line of their own,
/// become "?".
std::string PrintableText(std::string_view text);

/// The same, cut to kLongestLogText bytes; behind a text that is cut stands its length, as in
/// "aaa... (1048576 bytes)".
std::string LogText(std::string_view text);

}  // namespace QELO
