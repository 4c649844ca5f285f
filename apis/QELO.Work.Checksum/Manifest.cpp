#include "Manifest.h"

#include <webapi/JsonHelper.h>

namespace checksum {
void Manifest::Add(const std::string& digest, const std::string& name) {
  std::string escaped;
  for (const char c : QELO::JsonHelper::repairUtf8(name)) {
    escaped += c == '\\' ? "\\\\" : c == '\n' ? "\\n" : c == '\r' ? "\\r" : std::string(1, c);
  }
  const bool special = name.find_first_of("\\\n\r") != std::string::npos;
  const std::string line = (special ? "\\" : "") + digest + "  " + escaped + "\n";
  if (!complete_ || text_.size() + line.size() > kLimit) {
    complete_ = false;
    return;
  }
  text_ += line;
}

}  // namespace checksum
