#pragma once

#include <json/json.h>

#include "programs/webapi/check/Findings.h"

namespace QELO::AuthorProgram {

/// Checks that a value is a JSON Schema (draft 7): an object, or true or false, whose keywords are
/// known and have values of their types, nested schemas included. Whether expressions and
/// references are good, the framework's own reader of schemas knows.
void CheckSchema(const Json::Value& schema, Findings& findings);

/// Likewise of a method's parameters, which must be an object's schema.
void CheckObjectSchema(const Json::Value& schema, Findings& findings);

}  // namespace QELO::AuthorProgram
