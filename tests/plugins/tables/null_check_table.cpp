// Has methods that work, and a GetAPICheckTable() that gives null.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("ran");
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}

PLUGIN_EXPORT QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  return nullptr;
}
