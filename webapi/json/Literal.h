#pragma once

#include <json/json.h>

namespace QELO {

/// The name of a member in the source's own words. The JSON library keeps a pointer to such a name
/// and copies any other twice, which is half of what a new member costs: record[Literal("user")].
/// Not for libraries that may be closed before the value is gone.
using Literal = Json::StaticString;

}  // namespace QELO
