// The characteristics of this library are: asked for its method table, it throws.

#include <stdexcept>

#include "PluginTable.h"

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  throw std::runtime_error("no table today");
}
