#pragma once

#include <json/json.h>

#include "programs/webapi/diff/Changes.h"

namespace QELO::AuthorProgram {

/// Finds what callers of an API can do no longer: versions, methods, who may call, what methods
/// take and answer.
void CompareAPI(const Json::Value& before, const Json::Value& after, Changes& changes);

}  // namespace QELO::AuthorProgram
