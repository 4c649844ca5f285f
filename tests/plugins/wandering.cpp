// The characteristics of this library are: it leaves the process changed: another working
// directory and another buffer behind the C++ output stream.

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
