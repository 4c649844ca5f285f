// The compact text form. The JSON library's writer prints 0.1 as 0.10000000000000001 and costs a
// tenth of a short request; this one prints the shortest digits that read back as the same number.

#include <charconv>
#include <cmath>

#include "webapi/JsonHelper.h"
#include "webapi/base/Hex.h"

namespace QELO::JsonHelper {
namespace {

void writeValue(const Json::Value& value, std::string& text);

void writeEscape(unsigned char c, std::string& text) {
  switch (c) {
    case '"':
      text += "\\\"";
      break;
    case '\\':
      text += "\\\\";
      break;
    case '\b':
      text += "\\b";
      break;
    case '\f':
      text += "\\f";
      break;
    case '\n':
      text += "\\n";
      break;
    case '\r':
      text += "\\r";
      break;
    case '\t':
      text += "\\t";
      break;
    default:
      text += "\\u00";
      AppendHex(c, kLowerHex, text);
  }
}

void writeString(const char* begin, const char* end, std::string& text) {
  text += '"';
  const char* plain = begin;
  for (const char* at = begin; at != end; ++at) {
    const unsigned char c = static_cast<unsigned char>(*at);
    if (c < 0x20 || c == '"' || c == '\\') {
      text.append(plain, at);
      writeEscape(c, text);
      plain = at + 1;
    }
  }
  text.append(plain, end);
  text += '"';
}

template <typename Number>
void writeNumber(Number number, std::string& text) {
  char digits[32];
  const auto result = std::to_chars(digits, digits + sizeof digits, number);
  text.append(digits, result.ptr);
}

void writeReal(double real, std::string& text) {
  if (!std::isfinite(real)) {
    text += "null";  // JSON has no other word for it
    return;
  }
  const size_t start = text.size();
  writeNumber(real, text);
  if (text.find_first_of(".e", start) == std::string::npos) {
    text += ".0";  // a real number stays one when it is read back
  }
}

void writeArray(const Json::Value& array, std::string& text) {
  text += '[';
  const char* separator = "";
  for (const Json::Value& element : array) {
    text += separator;
    writeValue(element, text);
    separator = ",";
  }
  text += ']';
}

void writeObject(const Json::Value& object, std::string& text) {
  text += '{';
  const char* separator = "";
  for (auto it = object.begin(); it != object.end(); ++it) {
    const char* end = nullptr;
    const char* name = it.memberName(&end);
    text += separator;
    writeString(name, end, text);
    text += ':';
    writeValue(*it, text);
    separator = ",";
  }
  text += '}';
}

void writeValue(const Json::Value& value, std::string& text) {
  const char* begin = nullptr;
  const char* end = nullptr;
  switch (value.type()) {
    case Json::nullValue:
      text += "null";
      break;
    case Json::booleanValue:
      text += value.asBool() ? "true" : "false";
      break;
    case Json::intValue:
      writeNumber(value.asLargestInt(), text);
      break;
    case Json::uintValue:
      writeNumber(value.asLargestUInt(), text);
      break;
    case Json::realValue:
      writeReal(value.asDouble(), text);
      break;
    case Json::stringValue:
      value.getString(&begin, &end);
      writeString(begin, end, text);
      break;
    case Json::arrayValue:
      writeArray(value, text);
      break;
    case Json::objectValue:
      writeObject(value, text);
      break;
  }
}

}  // namespace

std::string toString(const Json::Value& value) {
  std::string text;
  writeValue(value, text);
  return text;
}

}  // namespace QELO::JsonHelper
