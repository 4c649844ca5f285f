#pragma once

#include <exception>

#include "webapi/base/Log.h"

namespace QELO {

/// Calls into an API library: an exception that would leave it is logged and ends here.
/// @param what    the call, for the log
/// @param source  the name that the log knows the caller by
/// @return false when an exception was caught
template <typename Call>
bool Fence(const char* what, Call call, const char* source = "APIRunner.cpp") {
  try {
    call();
    return true;
  } catch (const std::exception& error) {
    WEBAPI_LOG(source, "%s threw an exception: %s", what, LogText(error.what()).c_str());
  } catch (...) {
    WEBAPI_LOG(source, "%s threw an exception", what);
  }
  return false;
}

}  // namespace QELO
