#pragma once

#include <json/json.h>

namespace QELO {

/// Removes the temporary files of an upload. What is no regular file, or gone, is left.
/// @param paths  a list of paths
void RemoveTemporaryFiles(const Json::Value& paths);

}  // namespace QELO
