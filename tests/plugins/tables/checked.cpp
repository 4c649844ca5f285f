// Its check function refuses "run" in version 1, lets it pass in version 2 and throws in version 3.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include <stdexcept>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("ran");
}

static int refuse(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetError(444);
  return 0;
}

static int pass(QELO::APIRequest*, QELO::APIResponse*) {
  return 1;
}

static int raise(QELO::APIRequest*, QELO::APIResponse*) {
  throw std::runtime_error("check failed");
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {"QELO.Test.Call", 2, "run", run},
                                         {"QELO.Test.Call", 3, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}

PLUGIN_EXPORT QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  static QELO::_tag_API_CHECK_TABLE table[] = {
      {"QELO.Test.Call", 1, "run", refuse, {nullptr, nullptr}},
      {"QELO.Test.Call", 2, "run", pass, {nullptr, nullptr}},
      {"QELO.Test.Call", 3, "run", raise, {nullptr, nullptr}},
      {nullptr, 0, nullptr, nullptr, {nullptr, nullptr}}};
  return table;
}
