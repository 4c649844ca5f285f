// The web entry's check of sharing links, which are not served yet: each is refused.

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/WebAPIError.h"
#include "webapi/WebEntry.h"

namespace QELO {

bool WebEntry::CheckSharingPermission(APIRequest* request, APIResponse* response) {
  if (request == nullptr || response == nullptr) {
    return false;
  }
  response->SetError(WEBAPI_ERR_SHARING_REFUSED);
  request->SetAuthResult(AUTHORIZED_UNKNOWN);
  return false;
}

}  // namespace QELO
