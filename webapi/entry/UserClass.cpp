#include "webapi/entry/UserClass.h"

#include <algorithm>

#include "webapi/JsonHelper.h"

namespace QELO {

bool ListsUserClass(const Json::Value& allowUser, const std::string& userClass) {
  const Json::Value wanted(userClass);
  return allowUser.isArray() &&
         std::any_of(allowUser.begin(), allowUser.end(),
                     [&wanted](const Json::Value& entry) { return entry == wanted; });
}

int AuthLevelOf(const Json::Value& level) {
  return JsonHelper::asInt(level, AUTH_LOGIN);
}

}  // namespace QELO
