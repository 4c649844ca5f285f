#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"

namespace QELO {

/// The account whose rights a method's description asks for.
/// @param request     has the API's description
/// @param attributes  the method's
/// @return "" when it is the login user's, and nobody is logged in
inline std::string MethodAccount(APIRequest& request, const Json::Value& attributes) {
  if (APIDescription::IsSet(attributes, "grantByDefault")) {
    return "root";
  }
  if (APIDescription::IsSet(attributes, "grantByUser")) {
    return request.GetLoginUserName();
  }
  const APIDescription description(JsonHelper::member(request.Serialize(), "reqLib"));
  return description.GetRunAs(attributes);
}

}  // namespace QELO
