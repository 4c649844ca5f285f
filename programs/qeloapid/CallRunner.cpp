#include "programs/qeloapid/CallRunner.h"

#include <cstdio>
#include <cstdlib>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/model/request/CallerSession.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/daemon/Message.h"

namespace QELO {
std::string CallRunner::Answer(Json::Value& message, const std::string& socket, Note& note) {
  if (!JsonHelper::member(message, DaemonMessage::kRequest).isObject() ||
      !JsonHelper::member(message, DaemonMessage::kResponse).isObject()) {
    return "";
  }
  APIRequest& request = *Request();
  APIResponse& response = *Response();
  request.Deserialize(message[DaemonMessage::kRequest]);
  response.Deserialize(message[DaemonMessage::kResponse]);
  const CallName call(request);
  snprintf(note.call, sizeof note.call, "%s_%d_%s", call.api.c_str(), call.version,
           call.method.c_str());
  const std::string user = request.GetLoginUserName();
  snprintf(note.user, sizeof note.user, "%s", user.c_str());
  if (!user.empty()) {  // other programs of the system are told, as by the front
    setenv(kCallerVariable, user.c_str(), 1);
  }
  if (CheckRequestParam(&request, &response) && AddAPIInfo(&request)) {
    if (JsonHelper::isText(request.GetAPIInfo("socket"), socket)) {
      Process(&request, &response);
    } else {
      response.SetError(WEBAPI_ERR_NO_SUCH_API);
    }
  }
  note.code = response.GetError();
  return JsonHelper::toString(response.Serialize());
}

}  // namespace QELO
