#pragma once

#include <exception>

#include "webapi/model/Log.h"

namespace QELO {

/// Calls into an API library: an exception that would leave it is logged and ends here.
/// @param what  the call, for the log
/// @return false when an exception was caught
template <typename Call>
bool Fence(const char* what, Call call) {
  try {
    call();
    return true;
  } catch (const std::exception& error) {
    WEBAPI_LOG("APIRunner.cpp", "%s threw an exception: %s", what, error.what());
  } catch (...) {
    WEBAPI_LOG("APIRunner.cpp", "%s threw an exception", what);
  }
  return false;
}

}  // namespace QELO
