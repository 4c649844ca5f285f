// The web entry's hook for uploads, which are not served yet: none is read here. A method that
// reads its upload itself is called.

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/WebAPIError.h"
#include "webapi/WebEntry.h"

namespace QELO {
namespace {

constexpr int kUploadUnavailable = -9;  ///< "upload_err": the upload could not be converted

}  // namespace

bool WebEntry::HandleUpload(APIRequest* request, APIResponse* response) {
  if (request == nullptr || response == nullptr) {
    return false;
  }
  if (GetMethodAttr(request, "deferUpload")) {
    return true;
  }
  Json::Value errors(Json::objectValue);
  errors["upload_err"] = kUploadUnavailable;
  response->SetError(WEBAPI_ERR_UPLOAD_FAILED, errors);
  return false;
}

}  // namespace QELO
