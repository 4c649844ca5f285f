// Loads, but has no GetAPITable().
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include "PluginTable.h"

PLUGIN_EXPORT int NotATable() {
  return 0;
}
