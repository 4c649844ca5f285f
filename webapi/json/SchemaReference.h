#pragma once

#include <json/json.h>

namespace QELO {

/// What a schema stands for: itself, or what its "$ref" leads to. Only the schema's own document
/// can be referred to, as "#/definitions/size".
/// @param root  the document
/// @return null when the reference leads nowhere, or from reference to reference for ever
const Json::Value* FindReferred(const Json::Value& root, const Json::Value& schema);

}  // namespace QELO
