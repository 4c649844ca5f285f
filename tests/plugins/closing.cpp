// The characteristics of this library are: its method closes the C streams of the process.

#include <cstdio>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  std::fclose(stdin);
  std::fclose(stdout);
  response->SetSuccess("closed");
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
