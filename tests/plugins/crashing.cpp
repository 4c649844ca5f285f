// Dies of a signal within its method, and the process with it: nobody but the web server can answer
// the client any more.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include <csignal>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse*) {
  std::raise(SIGSEGV);
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
