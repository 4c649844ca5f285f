// The characteristics of this library are: its method table is null.

#include "PluginTable.h"

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  return nullptr;
}
