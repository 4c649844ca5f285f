// The web entry's relay to another host, which is not served yet: each request fails.

#include "webapi/APIResponse.h"
#include "webapi/WebAPIError.h"
#include "webapi/WebEntry.h"

namespace QELO {

bool WebEntry::ProcessRelay(APIRequest*, APIResponse* response) {
  response->SetError(WEBAPI_ERR_RELAY_FAILED);
  return false;
}

}  // namespace QELO
