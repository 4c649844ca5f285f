#pragma once

#include <json/json.h>

namespace QELO::AuthorProgram {

/// What a value is, in the words of messages: "a text", "a list" ...
const char* NameOfType(const Json::Value& value);

}  // namespace QELO::AuthorProgram
