// Description files as "webapi check" reads them: each value is found where it stands, whatever the
// text, and what is no schema is told.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "programs/webapi/check/CheckSchema.h"
#include "programs/webapi/text/DescriptionText.h"

using QELO::AuthorProgram::CheckSchema;
using QELO::AuthorProgram::DescriptionText;
using QELO::AuthorProgram::Findings;

namespace {

void demand(bool isTrue) {
  if (!isTrue) {
    abort();
  }
}

/// The character that a value of this type begins with.
bool beginsWell(const Json::Value& value, char c) {
  switch (value.type()) {
    case Json::objectValue:
      return c == '{';
    case Json::arrayValue:
      return c == '[';
    case Json::stringValue:
      return c == '"';
    case Json::booleanValue:
      return c == 't' || c == 'f';
    case Json::nullValue:
      return c == 'n';
    default:
      return c == '-' || (c >= '0' && c <= '9');
  }
}

void checkPlaces(const std::string& text, const Json::Value& value) {
  const auto place = static_cast<size_t>(value.getOffsetStart());
  demand(place < text.size() && beginsWell(value, text[place]));
  for (auto it = value.begin(); it != value.end(); ++it) {
    if (value.isObject()) {
      const auto name = static_cast<size_t>(it->getOffsetLimit());
      demand(name < text.size() && text[name] == '"');
    }
    checkPlaces(text, *it);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string text(reinterpret_cast<const char*>(data), size);
  DescriptionText description;
  if (!description.ReadText("fuzz.lib", text).empty()) {
    return 0;
  }
  checkPlaces(text, description.Root());
  Findings findings;
  CheckSchema(description.Root(), findings);
  for (const std::string& line : findings.Lines("fuzz.lib", description)) {
    demand(line.find('\n') == std::string::npos);
  }
  return 0;
}
