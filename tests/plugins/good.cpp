// Nothing is wrong with it: a method for each kind of answer.
//
// Tests: LifecycleTest.cpp, test_faulty_libraries.py

#include "PluginTable.h"

/// Answers the parameters.
static void echo(QELO::APIRequest* request, QELO::APIResponse* response) {
  response->SetSuccess(request->GetParam(""));
}

/// Answers what is known of the caller.
static void whoami(QELO::APIRequest* request, QELO::APIResponse* response) {
  Json::Value data;
  data["user"] = request->GetLoginUserName();
  data["isAdmin"] = request->IsAdmin();
  data["isAuthorized"] = request->IsAuthorized();
  data["authResult"] = static_cast<int>(request->GetAuthResult());
  data["address"] = request->GetRemoteIP();
  response->SetSuccess(data);
}

static void fail(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetError(400);
}

static void silent(QELO::APIRequest*, QELO::APIResponse*) {}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Good", 1, "echo", echo},
                                         {"QELO.Test.Good", 1, "whoami", whoami},
                                         {"QELO.Test.Good", 1, "fail", fail},
                                         {"QELO.Test.Good", 1, "silent", silent},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
