#include "webapi/entry/permission/UserClass.h"

#include <algorithm>

#include "webapi/JsonHelper.h"
#include "webapi/platform/Core.h"

namespace QELO {

bool ListsUserClass(const Json::Value& allowUser, const std::string& userClass) {
  return allowUser.type() == Json::arrayValue &&
         std::any_of(allowUser.begin(), allowUser.end(), [&](const Json::Value& entry) {
           return JsonHelper::isText(entry, userClass);
         });
}

bool HoldsAppPriv(const Json::Value& appPriv, const std::string& user, const std::string& address) {
  if (appPriv.isNull()) {
    return true;
  }
  if (!appPriv.isString()) {
    return false;
  }
  const std::string name = appPriv.asString();
  return name.empty() || QLIBAppPrivUserHas(user.c_str(), name.c_str(), address.c_str()) > 0;
}

}  // namespace QELO
