// The characteristics of this library are: it loads, but exports no method table.

#include "PluginTable.h"

PLUGIN_EXPORT int NotATable() {
  return 0;
}
