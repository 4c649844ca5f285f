#pragma once

#include <syslog.h>

#include <exception>
#include <type_traits>

#include "webapi/APIResponse.h"
#include "webapi/method/Download.h"
#include "webapi/method/Error.h"
#include "webapi/method/Log.h"
#include "webapi/method/Write.h"

/// Where what a function gives, or throws, becomes an answer.
namespace QELO::method {

inline void Answer(APIResponse& response, const Error& error) {
  if (error.code == WEBAPI_ERR_NONE) {  // would be taken for success
    syslog(LOG_ERR, "%s:%d a method failed with code 0", "Method.h", __LINE__);
  }
  response.SetError(error.code == WEBAPI_ERR_NONE ? WEBAPI_ERR_NO_ANSWER : error.code,
                    error.detail);
}

inline void Answer(APIResponse&, const Answered&) {}

inline void Answer(APIResponse& response, const Download& file) {
  if (const int error = Send(response, file); error != 0) {
    Answer(response, Error{file.unreadable, ReasonOf(error)});
    return;
  }
  response.SetSuccess();  // calls from code would get 117
}

template <typename T>
void Answer(APIResponse& response, const T& value) {
  if constexpr (std::same_as<T, Json::Value>) {
    response.SetSuccess(value);
  } else {
    response.SetSuccess(ToJson(value));
  }
}

template <typename T>
void Answer(APIResponse& response, const Result<T>& result) {
  if (!result) {
    Answer(response, result.Failure());
  } else if constexpr (std::is_void_v<T>) {
    response.SetSuccess();
  } else {
    Answer(response, *result);
  }
}

/// Makes a call whose exceptions end here, as the response's error.
/// @return whether it returned
template <typename Function>
bool Guarded(APIResponse& response, Function function) {
  try {
    function();
    return true;
  } catch (const Error& error) {
    Answer(response, error);
    return false;
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "%s:%d method threw an exception: %s", "Method.h", __LINE__,
           LogText(error.what()).c_str());
  } catch (...) {
    syslog(LOG_ERR, "%s:%d method threw an exception", "Method.h", __LINE__);
  }
  response.SetError(WEBAPI_ERR_NO_ANSWER);
  return false;
}

/// Calls, and answers with what comes of it.
template <typename Function>
void AnswerWith(APIResponse& response, Function function) {
  if constexpr (std::is_void_v<decltype(function())>) {
    function();
    response.SetSuccess();
  } else {
    Answer(response, function());
  }
}

}  // namespace QELO::method
