// The web entry's third road: the call is another host's to serve.

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/WebEntry.h"
#include "webapi/base/BrokenPipe.h"
#include "webapi/entry/intake/RequestBody.h"
#include "webapi/entry/intake/UnreadBody.h"
#include "webapi/entry/output/WriteAnswer.h"
#include "webapi/entry/permission/PermissionCheck.h"
#include "webapi/entry/permission/Refusal.h"
#include "webapi/entry/relay/Relay.h"
#include "webapi/platform/CredRequest.h"
#include "webapi/runner/CompoundCall.h"

namespace QELO {
namespace {

void logRefusal(const APIRequest& request) {
  const char* token = request.GetQeloAccessTokenID();
  LogRefusal(request, RefusalReason(request.GetAuthResult(), token != nullptr && *token != '\0'));
}

}  // namespace

bool WebEntry::ProcessRelay(APIRequest* request, APIResponse* response) {
  CredRequestMgr manager;
  if (!CheckRequestParam(request, response) || !AddAPIInfo(request)) {
    return false;
  }
  const int code = CheckPermission(JsonHelper::asBool(request->GetAPIInfo("skipTimeout", false)));
  if (code != WEBAPI_ERR_NONE) {
    response->SetError(code);
    logRefusal(*request);
    return false;
  }
  // A token is for certain calls, and whether it is for a compound request's own is asked one by
  // one.
  if (request->GetAPIClass() == kCompoundAPI && check_->CameByToken()) {
    response->SetError(WEBAPI_ERR_NOT_AUTHENTICATED);
    LogRefusal(*request, "compound requests are not relayed by access token");
    return false;
  }
  std::string answer;
  if (!Relay(*request, *response).Ask(manager, answer)) {
    return false;
  }
  response->SetEnableOutput(false);
  const BrokenPipe tolerated;
  OutputHeader();
  UnreadBody body = UnreadBody::OfRequest();
  WriteAnswer(answer, body);
  if (request->IsUploadRequest()) {
    RequestBody::CloseStandardInput();  // its body is gone on its way
  }
  return true;
}

}  // namespace QELO
