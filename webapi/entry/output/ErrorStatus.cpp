#include "webapi/entry/output/ErrorStatus.h"

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/HttpStatus.h"
#include "webapi/WebAPIError.h"

namespace QELO {
namespace {

constexpr int kFirstOwnError = 400;  ///< codes from here on are the API's own
constexpr int kUnprocessable = 422;

int statusOf(int code, bool isKnown) {
  switch (code) {
    case WEBAPI_ERR_BAD_REQUEST:
    case WEBAPI_ERR_UPLOAD_FAILED:
    case WEBAPI_ERR_NO_COMPOUND:
    case WEBAPI_ERR_POLLING_GROUP:
      return HTTP_STATUS_BAD_REQUEST;
    case WEBAPI_ERR_NO_SUCH_API:
    case WEBAPI_ERR_NO_SUCH_METHOD:
    case WEBAPI_ERR_NO_SUCH_VERSION:
      return HTTP_STATUS_NOT_FOUND;
    case WEBAPI_ERR_NO_PERMISSION:
      return isKnown ? HTTP_STATUS_FORBIDDEN : HTTP_STATUS_UNAUTHORIZED;
    case WEBAPI_ERR_SESSION_TIMEOUT:
    case WEBAPI_ERR_SESSION_INTERRUPTED:
    case WEBAPI_ERR_NOT_AUTHENTICATED:
      return HTTP_STATUS_UNAUTHORIZED;
    case WEBAPI_ERR_UPLOAD_REFUSED:
      return HTTP_STATUS_UNSUPPORTED_MEDIA_TYPE;
    case WEBAPI_ERR_RELAY_FAILED:
      return HTTP_STATUS_BAD_GATEWAY;
    case WEBAPI_ERR_DEMO_REFUSED:
    case WEBAPI_ERR_SHARING_NO_SESSION:
    case WEBAPI_ERR_SHARING_MISMATCH:
    case WEBAPI_ERR_SHARING_DENIED:
    case WEBAPI_ERR_SHARING_TIMEOUT:
    case WEBAPI_ERR_SHARING_REFUSED:
    case WEBAPI_ERR_SHARING_APPLICATION:
    case WEBAPI_ERR_ADDRESS_MISMATCH:
    case WEBAPI_ERR_NO_APP_PRIVILEGE:
      return HTTP_STATUS_FORBIDDEN;
    default:
      return code >= kFirstOwnError ? kUnprocessable : HTTP_STATUS_INTERNAL_SERVER_ERROR;
  }
}

}  // namespace

void SetErrorStatus(const APIRequest& request, APIResponse& response) {
  const int code = response.GetError();
  if (code == WEBAPI_ERR_NONE || response.HasHeader("Status")) {
    return;
  }
  const int status = statusOf(code, request.GetAuthResult() >= AUTHORIZED_YES);
  if (status == HTTP_STATUS_UNAUTHORIZED) {
    response.SetHeader("WWW-Authenticate", "Qelo");
  }
  response.SetStatus(static_cast<_tag_HTTP_STATUS_CODE>(status), "");
}

}  // namespace QELO
