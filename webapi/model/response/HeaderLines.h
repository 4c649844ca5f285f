#pragma once

#include <string>
#include <vector>

namespace QELO {

class APIResponse;

/// The lines that a response's own headers and cookies make on the wire, without line ends.
///
/// A name that is no RFC 9110 token, or a text that holds CR, LF or NUL, makes no line and is
/// logged. A header that is no text makes none silently. At most one line is a Content-Type,
/// whatever the spelling of the name: a spelling other than the preset "Content-type" wins.
/// @param source  who logs, as "WebEntry.cpp"
std::vector<std::string> HeaderLines(const APIResponse& response, const char* source);
std::vector<std::string> CookieLines(const APIResponse& response);

}  // namespace QELO
