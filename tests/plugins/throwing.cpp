// The characteristics of this library are: its methods let exceptions escape, after they have set
// a success.

#include <stdexcept>

#include "PluginTable.h"

static void runStandard(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("half done");
  throw std::runtime_error("method failed");
}

static void runOther(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("half done");
  throw 42;
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", runStandard},
                                         {"QELO.Test.Call", 2, "run", runOther},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
