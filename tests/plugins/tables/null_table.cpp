// GetAPITable() gives null.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include "PluginTable.h"

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  return nullptr;
}
