// Throws when a sharing check library is asked for its table.
//
// Tests: LibraryTest.cpp

#include <stdexcept>

#include "../PluginTable.h"

PLUGIN_EXPORT QELO::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
  throw std::runtime_error("no checks today");
}
