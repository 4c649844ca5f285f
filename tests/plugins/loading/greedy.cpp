// Takes more memory, while it is loaded, than a request may have before its method is called.
// Nothing is wrong with that: an API library may need it.
//
// Tests: test_limits.py

#include <memory>

#include "PluginTable.h"

static constexpr size_t kBytes = 300 << 20;  // of address space; no page of it is touched
static const std::unique_ptr<char[]> memory(new char[kBytes]);

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess(memory != nullptr);
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
