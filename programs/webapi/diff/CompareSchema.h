#pragma once

#include <json/json.h>

#include <string>

#include "programs/webapi/diff/Changes.h"

namespace QELO::AuthorProgram {

/// Finds what an old schema of parameters takes and the new one does not.
/// @param path  of the value within the parameters, as "/size"; "" for all of them
void CompareParameters(const Json::Value& before, const Json::Value& after, const std::string& path,
                       Changes& changes);

/// Finds what an old schema of results promises and the new one does not.
void CompareResults(const Json::Value& before, const Json::Value& after, const std::string& path,
                    Changes& changes);

}  // namespace QELO::AuthorProgram
