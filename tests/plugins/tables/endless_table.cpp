// Has a table without an end: the last entry is missing, here within memory that goes on.
//
// Tests: test_check.py

#include <vector>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("ran");
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static constexpr size_t kMoreThanAnyTable = 20000;
  static std::vector<QELO::_tag_API_TABLE> table(kMoreThanAnyTable,
                                                 {"QELO.Test.Endless", 1, "run", run});
  return table.data();
}
