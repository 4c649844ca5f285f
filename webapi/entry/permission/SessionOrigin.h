#pragma once

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"

namespace QELO {

/// Whether the request's session id came as its parameter, which another site cannot make a
/// browser send: no anti-forgery token is asked for then. Any other "_sid" waives nothing.
inline bool IsSessionFromParameter(const APIRequest& request) {
  const std::string session = request.GetSessionID();
  return !session.empty() && JsonHelper::asString(request.GetParam("_sid")) == session;
}

}  // namespace QELO
