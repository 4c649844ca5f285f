#include "webapi/entry/relay/Relay.h"

#include <syslog.h>

#include <cstdio>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/base/TakenBody.h"
#include "webapi/json/Literal.h"
#include "webapi/platform/CredRequest.h"

namespace QELO {
namespace {

constexpr char kHost[] = "relay_zt";
constexpr char kTimeout[] = "relay_timeout";
constexpr int kNoTimeout = -1;
constexpr int kFailLine = 733;  ///< administrators' log filters know the message by this line

Json::Value take(Json::Value& params, const char* name) {
  Json::Value value;
  if (params.type() == Json::objectValue) {
    params.removeMember(name, &value);
  }
  return value;
}

}  // namespace

bool Relay::Ask(CredRequestMgr& manager, std::string& answer) {
  Json::Value params = request_.GetParam("");
  const long host = JsonHelper::asInt64(take(params, kHost));
  const int timeout = JsonHelper::asInt(take(params, kTimeout), kNoTimeout);
  const int index = Queue(manager, host, params);
  if (index < 0) {
    response_.SetError(WEBAPI_ERR_RELAY_FAILED);
    return false;
  }
  if (timeout > 0) {
    manager.GetRequest(index)->SetResponseTimeout(timeout);
  }
  if (!manager.Run()) {
    syslog(LOG_ERR, "%s:%d relay request fail[%d]", "WebEntry", kFailLine, manager.GetError());
    response_.SetError(WEBAPI_ERR_RELAY_FAILED);
    return false;
  }
  answer = manager.GetResponse(index);
  return true;
}

int Relay::Queue(CredRequestMgr& manager, long host, const Json::Value& params) {
  const std::string api = request_.GetAPIClass();
  const int version = request_.GetAPIVersion();
  const std::string method = request_.GetAPIMethod();
  if (!request_.IsUploadRequest()) {
    return manager.AddWebAPIRequest(host, api, version, method, params);
  }
  if (TakenBodyBytes() > 0) {
    // Its call stands in the form: what is left would be another body than the one announced.
    WEBAPI_LOG("WebEntry", "an upload whose body was begun to be read is not relayed");
    return -1;
  }
  Json::Value headers(Json::objectValue);
  headers[Literal("Content-Type")] = request_.GetEnv("CONTENT_TYPE");
  headers[Literal("Content-Length")] = request_.GetEnv("CONTENT_LENGTH");
  return manager.AddRelayRequest(host, api, version, method, params, headers, stdin, 0);
}

}  // namespace QELO
