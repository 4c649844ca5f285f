#pragma once

#include <json/json.h>

#include "paths/Item.h"
#include "paths/VirtualPath.h"

namespace files {

/// An item as clients see it. "path" is null where the name is no UTF-8: nothing that a client
/// sends could name it.
Json::Value jsonOf(const VirtualPath& parent, const Item& item);

/// A shared folder as an item of the root.
Json::Value jsonOf(const struct Share& share);

}  // namespace files
