#pragma once

#include <json/json.h>

#include "programs/webapi-exec-options.h"

namespace QELO::ExecProgram {

/// Makes the call or the batch that the options tell.
/// @param answer  receives the answer
/// @return what kept it from being made, or ""
std::string makeCall(const Options& options, Json::Value& answer);

}  // namespace QELO::ExecProgram
