#pragma once

#include <json/json.h>

#include <string>

#include "programs/webapi/check/CheckMembers.h"
#include "programs/webapi/check/Findings.h"

namespace QELO::AuthorProgram {

/// Checks one API's description: members, versions, methods and their attributes.
void CheckAPI(const Json::Value& description, const CheckOptions& options, Findings& findings);

/// Checks the defaults for all of them, lib.def.
void CheckDefaults(const Json::Value& defaults, const CheckOptions& options, Findings& findings);

}  // namespace QELO::AuthorProgram
