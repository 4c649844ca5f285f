// Throws when it is asked for its method table.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include <stdexcept>

#include "PluginTable.h"

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  throw std::runtime_error("no table today");
}
