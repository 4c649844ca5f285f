// Lets exceptions escape from its methods, a standard one and one of no known type, after it has
// set a success.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

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
