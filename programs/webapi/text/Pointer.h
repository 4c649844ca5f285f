#pragma once

#include <json/json.h>

#include <string_view>

namespace QELO::AuthorProgram {

/// The value that a JSON pointer (RFC 6901) leads to, as "/params/properties/size"; where it leads
/// nowhere, the last one on the way.
const Json::Value& ValueAt(const Json::Value& root, std::string_view pointer);

}  // namespace QELO::AuthorProgram
