#include "webapi/runner/daemon/DaemonCall.h"

#include <sys/stat.h>

#include <cstdlib>
#include <string>

#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/base/MemoryBound.h"
#include "webapi/platform/Daemon.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/daemon/Message.h"

namespace QELO {
namespace {

constexpr char kInDaemon[] = "in_qeloapid";

const Json::Value& info(const APIRequest& request, const char* name) {
  return request.GetAPIInfoRef(name, Json::Value::nullSingleton());
}

bool isSocket(const std::string& path) {
  struct stat found {};
  return stat(path.c_str(), &found) == 0 && S_ISSOCK(found.st_mode);
}

}  // namespace

DaemonCall::DaemonCall(APIRunner& runner, APIRequest* request)
    : runner_(runner), request_(request), path_(JsonHelper::asString(info(*request, "socket"))) {}

bool DaemonCall::IsPossible() {
  if (path_.empty() || getenv(kInDaemon) != nullptr ||
      JsonHelper::asBool(info(*request_, "disableSocket"))) {
    return false;
  }
  if (!isSocket(path_)) {
    WEBAPI_LOG("APIRunner.cpp", "socket is not ready: %s\n", LogText(path_).c_str());
    return false;
  }
  const CallName call(*request_);
  const Json::Value& attributes = runner_.GetMethod(call.api, call.version, call.method);
  const auto isSet = [&](const char* name) { return APIDescription::IsSet(attributes, name); };
  return !(isSet("allowUpload") && isSet("deferUpload")) && !isSet("allowDownload") &&
         !isSet("disableSocket");
}

bool DaemonCall::Run(APIResponse* response) {
  MemoryBound::Lift();  // whoever calls is known, and the answer is as large as the method makes it
  response->SetError(WEBAPI_ERR_NO_ANSWER);
  std::string text;
  if (!Exchange(response, text)) {
    return false;
  }
  Json::Value answer;
  if (!DaemonMessage::Read(text, answer)) {
    WEBAPI_LOG("APIRunner.cpp", "Failed to parse response from socket: %s\n",
               LogText(path_).c_str());
    return false;
  }
  response->Deserialize(answer);
  return true;
}

bool DaemonCall::Exchange(APIResponse* response, std::string& answer) {
  qelodaemon::DomainSockConnection connection(path_);
  if (!connection.Connect()) {
    WEBAPI_LOG("APIRunner.cpp", "Failed to connect domain socket: %s\n", LogText(path_).c_str());
    return false;
  }
  Json::Value message(Json::objectValue);
  message[DaemonMessage::kRequest] = request_->Serialize();
  message[DaemonMessage::kResponse] = response->Serialize();
  if (!connection.Send(JsonHelper::toString(message)) || !connection.Recv(answer)) {
    WEBAPI_LOG("APIRunner.cpp", "Failed to send and recv data from socket: %s\n",
               LogText(path_).c_str());
    return false;
  }
  return true;
}

}  // namespace QELO
