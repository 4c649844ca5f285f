#pragma once

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"

namespace QELO {

/// Whether the request's session id came as its parameter, which another site cannot make a
/// browser send: no anti-forgery token is asked for then. Any other "_sid" waives nothing.
/// @param session  the request's session id
inline bool IsSessionFromParameter(const APIRequest& request, const std::string& session) {
  const Json::Value& sent = request.GetParamRef("_sid", Json::Value::nullSingleton());
  return !session.empty() && JsonHelper::asString(sent) == session;
}

}  // namespace QELO
