#include "programs/webapi/check/TypeName.h"

namespace QELO::AuthorProgram {

const char* NameOfType(const Json::Value& value) {
  switch (value.type()) {
    case Json::nullValue:
      return "null";
    case Json::intValue:
    case Json::uintValue:
      return value.isInt() ? "an integer" : "an integer beyond 32 bits";
    case Json::realValue:
      return "a fraction";
    case Json::stringValue:
      return "a text";
    case Json::booleanValue:
      return "true or false";
    case Json::arrayValue:
      return "a list";
    default:
      return "an object";
  }
}

}  // namespace QELO::AuthorProgram
