// Sends its client elsewhere.
//
// Tests: test_servers.py

#include "PluginTable.h"

static void run(QELO::APIRequest* request, QELO::APIResponse* response) {
  response->Redirect(request->GetParam("to", "/").asString());
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
