// Holes in the method table: one entry has no method name, one no function.
//
// Tests: HardeningTest.cpp

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("ran");
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, nullptr, run},
                                         {"QELO.Test.Call", 1, "run", run},
                                         {"QELO.Test.Call", 2, "run", nullptr},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
