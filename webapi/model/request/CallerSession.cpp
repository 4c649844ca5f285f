#include "webapi/model/request/CallerSession.h"

#include "webapi/APIRequest.h"
#include "webapi/json/Literal.h"
#include "webapi/platform/Core.h"

namespace QELO {

CallerSession CallerSession::Of(const APIRequest& request) {
  CallerSession session;
  session.username = request.GetLoginUserName();
  session.isAdmin = request.IsAdmin();
  session.sessFile = request.GetSessionFilePath();
  session.isTimeout = request.IsTimeout();
  session.timeout = request.GetTimeoutDuration();
  session.isSkipCheckIP = request.IsSkipCheckIP();
  session.uiLang = request.GetUILanguage();
  session.app = request.GetApplication();
  session.webapi = request.GetWebAPIPriv();
  session.isAuthorized = request.IsAuthorized();
  session.tokenEnable = request.IsTokenEnable();
  return session;
}

Json::Value CallerSession::ToJson() const {
  Json::Value section(Json::objectValue);
  section[Literal("username")] = username;
  section[Literal("isAdmin")] = isAdmin;
  section[Literal("sessFile")] = sessFile;
  section[Literal("isTimeout")] = isTimeout;
  section[Literal("timeout")] = Json::Int64{timeout};
  section[Literal("isSkipCheckIP")] = isSkipCheckIP;
  section[Literal("uiLang")] = uiLang;
  section[Literal("app")] = app;
  section[Literal("webapi")] = webapi;
  section[Literal("isAuthorized")] = isAuthorized;
  section[Literal("tokenEnable")] = tokenEnable;
  return section;
}

Json::Value CallerSession::OfUser(const std::string& user) {
  Json::Value section(Json::objectValue);
  section["username"] = user;
  section["isAdmin"] = QLIBGroupIsAdminGroupMem(user.c_str(), 0) == 1;
  section["isTimeout"] = false;
  section["isAuthorized"] = true;
  return section;
}

Json::Value CallerSession::OfNobody(const APIRequest& request) {
  Json::Value section(Json::objectValue);
  section["uiLang"] = request.GetUILanguage();
  section["tokenEnable"] = request.IsTokenEnable();
  return section;
}

}  // namespace QELO
