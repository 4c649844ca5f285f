#pragma once

#include <syslog.h>

#include <algorithm>
#include <string>

/// One message to syslog at error level: "%s:%d " with the source's name and the line, then the
/// format.
/// @param source  the name that administrators know the component by, as "APIRunner.cpp"; it stays
///                when code moves to another file
#define WEBAPI_LOG(source, format, ...) \
  syslog(LOG_ERR, "%s:%d " format, source, __LINE__ __VA_OPT__(, ) __VA_ARGS__)

namespace QELO {

/// A client's text as a log can show it: control characters, which could begin a line of their own,
/// become "?".
inline std::string LogText(std::string text) {
  std::replace_if(
      text.begin(), text.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; }, '?');
  return text;
}

}  // namespace QELO
