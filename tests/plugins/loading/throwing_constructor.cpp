// Throws from a static object's constructor, while the loader has it in hand and nothing can be
// unwound: the process ends without an answer.
//
// Tests: CheckTableTest.cpp, test_faulty_libraries.py

#include <stdexcept>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("ran");
}

namespace {
struct Thrower {
  Thrower() { throw std::runtime_error("constructor failed"); }
} thrower;
}  // namespace

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
