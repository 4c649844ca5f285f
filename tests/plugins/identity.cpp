// Well-behaved; answers who the caller is and who the process is during the call. One function
// serves several methods, which their description gives different attributes.
//
// Tests: test_credentials.py, QELO.Test.Identity.lib

#include <grp.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

#include "PluginTable.h"

static void whoami(QELO::APIRequest* request, QELO::APIResponse* response) {
  uid_t realUser = 0, effectiveUser = 0, savedUser = 0;
  gid_t realGroup = 0, effectiveGroup = 0, savedGroup = 0;
  gid_t groups[64];
  char directory[4096] = "";
  Json::Value data;
  if (getresuid(&realUser, &effectiveUser, &savedUser) != 0 ||
      getresgid(&realGroup, &effectiveGroup, &savedGroup) != 0 ||
      getcwd(directory, sizeof(directory)) == nullptr) {
    return;
  }
  data["euid"] = effectiveUser;
  data["suid"] = savedUser;
  data["egid"] = effectiveGroup;
  data["sgid"] = savedGroup;
  data["groups"] = Json::Value(Json::arrayValue);
  for (int i = 0, count = getgroups(64, groups); i < count; ++i) {
    data["groups"].append(groups[i]);
  }
  data["directory"] = directory;
  data["user"] = request->GetLoginUserName();
  const char* variable = getenv("QELO_WEBAPI_USERNAME");
  data["userVariable"] = variable != nullptr ? variable : "";
  data["session"] = request->GetSessionID();
  data["uid"] = request->GetLoginUID();
  data["isAdmin"] = request->IsAdmin();
  data["isTimeout"] = request->IsTimeout();
  data["isAuthorized"] = request->IsAuthorized();
  data["authResult"] = static_cast<int>(request->GetAuthResult());
  data["address"] = request->GetRemoteIP();
  data["parameters"] = request->GetParam("");
  response->SetSuccess(data);
}

static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Identity", 1, "plain", whoami},
                                       {"QELO.Test.Identity", 1, "patient", whoami},
                                       {"QELO.Test.Identity", 1, "anywhere", whoami},
                                       {"QELO.Test.Identity", 1, "asUser", whoami},
                                       {"QELO.Test.Identity", 1, "asRoot", whoami},
                                       {"QELO.Test.Identity", 1, "asAlice", whoami},
                                       {"QELO.Test.Identity", 1, "grantable", whoami},
                                       {"QELO.Test.Identity", 1, "adminOnly", whoami},
                                       {"QELO.Test.Identity", 1, "patientAsRoot", whoami},
                                       {"QELO.Test.Open", 1, "plain", whoami},
                                       {"QELO.Test.Open", 1, "asRoot", whoami},
                                       {nullptr, 0, nullptr, nullptr}};

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
