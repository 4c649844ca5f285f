// The characteristics of this library are: a static object of it throws while the library is
// loaded.

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
