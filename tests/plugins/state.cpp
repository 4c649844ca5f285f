// Well-behaved; answers what the process looks like during the call, or nothing at all.
//
// Tests: ExecutionTest.cpp, CredentialSwitchTest.cpp

#include <sys/resource.h>
#include <unistd.h>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  Json::Value data;
  data["priority"] = getpriority(PRIO_PROCESS, 0);
  data["euid"] = static_cast<int>(geteuid());
  data["egid"] = static_cast<int>(getegid());
  data["code"] = response->GetError();
  response->SetSuccess(data);
}

static void stayIdle(QELO::APIRequest*, QELO::APIResponse*) {}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {"QELO.Test.Call", 1, "stayIdle", stayIdle},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
