// Leaves the process changed behind it: another working directory, and no buffer behind the C++
// output stream.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include <unistd.h>

#include <iostream>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  [[maybe_unused]] const int result = chdir("/");
  std::cout.rdbuf(nullptr);
  response->SetSuccess("gone");
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
