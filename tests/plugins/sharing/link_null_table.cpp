// A sharing check library whose GetAPISharingCheckTable() gives null.
//
// Tests: LibraryTest.cpp

#include "../PluginTable.h"

PLUGIN_EXPORT QELO::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
  return nullptr;
}
