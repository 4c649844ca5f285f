#pragma once

#include <json/json.h>

#include <cstddef>
#include <string_view>

namespace QELO::Platform {

enum class JsonText {
  kValue,    ///< the text is one JSON value as a whole, of which no digit gets lost
  kOther,    ///< it is not
  kTooMany,  ///< it has more values than are left
};

/// Reads the JSON value that a text is as a whole, with the blanks around it.
/// @param value       receives the value; unchanged when there is none
/// @param valuesLeft  how many values there may be, nested ones counted; those that were read are
///                    taken off
JsonText readJsonText(std::string_view text, Json::Value& value, size_t& valuesLeft);

}  // namespace QELO::Platform
