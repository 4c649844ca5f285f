// The characteristics of this library are: its method ends the process by a signal.

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
