// Never gets loaded: the constructor of a static object waits for what does not come.
//
// Tests: test_check.py

#include <unistd.h>

#include "PluginTable.h"

static const int waited = pause();

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  return waited == 0 ? nullptr : nullptr;
}
