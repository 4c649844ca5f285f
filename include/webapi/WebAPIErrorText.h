#pragma once

#include "webapi/WebAPIError.h"

namespace QELO {

/// What the framework's error codes mean, for people: one short line each, in order of the codes.
struct WebAPIErrorMeaning {
  int code;
  const char* text;
};

inline constexpr WebAPIErrorMeaning kWebAPIErrorMeanings[] = {
    {WEBAPI_ERR_NONE, "success"},
    {WEBAPI_ERR_BAD_REQUEST, "bad or missing input"},
    {WEBAPI_ERR_NO_SUCH_API, "no such API"},
    {WEBAPI_ERR_NO_SUCH_METHOD, "the API's version has no such method"},
    {WEBAPI_ERR_NO_SUCH_VERSION, "the API has no such version"},
    {WEBAPI_ERR_NO_PERMISSION, "no permission"},
    {WEBAPI_ERR_SESSION_TIMEOUT, "the login session timed out"},
    {WEBAPI_ERR_SESSION_INTERRUPTED, "the login session is broken"},
    {WEBAPI_ERR_UPLOAD_FAILED, "the upload failed"},
    {WEBAPI_ERR_RELAY_FAILED, "relaying the request failed"},
    {WEBAPI_ERR_NO_COMPOUND, "no list of calls, or no process for a task"},
    {WEBAPI_ERR_NO_LIBRARY, "the API's library cannot be loaded"},
    {WEBAPI_ERR_COMPOUND_STOPPED, "not run, since a call before it failed"},
    {WEBAPI_ERR_COMPOUND_TRANSFER, "uploads and downloads cannot be part of a batch"},
    {WEBAPI_ERR_POLLING_GROUP, "no such group to share a task with"},
    {WEBAPI_ERR_UPLOAD_REFUSED, "the method takes no upload"},
    {WEBAPI_ERR_DEMO_REFUSED, "not available in demo mode"},
    {WEBAPI_ERR_NO_ANSWER, "the method could not be run or gave no answer"},
    {WEBAPI_ERR_PROCESS_NAME, "the process could not be named"},
    {WEBAPI_ERR_NOT_AUTHENTICATED, "not logged in"},
    {WEBAPI_ERR_METHOD_MISSING, "the API's library lacks the method"},
    {WEBAPI_ERR_SHARING_NO_SESSION, "not signed in to the sharing link"},
    {WEBAPI_ERR_SHARING_MISMATCH, "signed in to another sharing link"},
    {WEBAPI_ERR_SHARING_DENIED, "the sharing link refuses access"},
    {WEBAPI_ERR_SHARING_TIMEOUT, "the sharing link's session timed out"},
    {WEBAPI_ERR_SHARING_REFUSED, "no sharing link, or not available by one"},
    {WEBAPI_ERR_SHARING_APPLICATION, "the sharing link's application refuses the call"},
    {WEBAPI_ERR_ADDRESS_MISMATCH, "called from another address than logged in from"},
    {WEBAPI_ERR_NO_APP_PRIVILEGE, "no privilege to use the application"},
};

/// @return the code's meaning, never null; codes from 400 on are each API's own
constexpr const char* WebAPIErrorText(int code) {
  constexpr int kFirstOfAPIs = 400;
  for (const WebAPIErrorMeaning& meaning : kWebAPIErrorMeanings) {
    if (meaning.code == code) {
      return meaning.text;
    }
  }
  return code >= kFirstOfAPIs ? "an error of the API's own" : "unknown error";
}

}  // namespace QELO
