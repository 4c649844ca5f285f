// Who the caller is: what QELO.Access.Session answers to "current", but for what takes root's
// rights, so that a worker may answer it.

#include <webapi/APIAuth.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

#include <string>

static void current(QELO::APIRequest* request, QELO::APIResponse* response) {
  const std::string user = request->GetLoginUserName();
  Json::Value data(Json::objectValue);
  data["user"] = user;
  data["class"] = QELO::APIAuth::GetUserClass(request->IsAdmin(), user);
  data["isAdmin"] = request->IsAdmin();
  data["language"] = request->GetUILanguage();
  data["address"] = request->GetRemoteIP();
  response->SetSuccess(data);
}

extern "C" __attribute__((visibility("default"))) QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Bench.Worker", 1, "current", current},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
