#pragma once

#include <webapi/APIRequest.h>

#include "paths/NewFile.h"

namespace files {

/// The parameter "existing": "refuse", the default, "replace" or "skip".
/// @return false when it is something else; `existing` is then kRefuse
bool readExisting(const QELO::APIRequest& request, Existing& existing);

}  // namespace files
