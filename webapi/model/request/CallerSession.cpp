#include "webapi/model/request/CallerSession.h"

#include "webapi/platform/Core.h"

namespace QELO {

Json::Value makeUserSession(const std::string& user) {
  Json::Value session(Json::objectValue);
  session["username"] = user;
  session["isAdmin"] = QLIBGroupIsAdminGroupMem(user.c_str(), 0) == 1;
  session["isTimeout"] = false;
  session["isAuthorized"] = true;
  return session;
}

}  // namespace QELO
