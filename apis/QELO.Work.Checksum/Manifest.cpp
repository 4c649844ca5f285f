#include "Manifest.h"

namespace checksum {
namespace {

constexpr char kReplacement[] = "\xEF\xBF\xBD";

/// Bytes of the well-formed UTF-8 character at the start of a text, 0 when there is none.
size_t characterLength(const unsigned char* text, size_t size) {
  const unsigned char first = text[0];
  if (first < 0x80) {
    return 1;
  }
  const size_t length = first >= 0xC2 && first < 0xE0   ? 2
                        : first >= 0xE0 && first < 0xF0 ? 3
                        : first >= 0xF0 && first < 0xF5 ? 4
                                                        : 0;
  if (length == 0 || length > size) {
    return 0;
  }
  for (size_t i = 1; i < length; ++i) {
    if ((text[i] & 0xC0) != 0x80) {
      return 0;
    }
  }
  // Overlong forms, surrogates and numbers beyond the last character.
  const unsigned char second = text[1];
  const bool wrong = (first == 0xE0 && second < 0xA0) || (first == 0xED && second > 0x9F) ||
                     (first == 0xF0 && second < 0x90) || (first == 0xF4 && second > 0x8F);
  return wrong ? 0 : length;
}

}  // namespace

std::string printable(const std::string& name) {
  std::string text;
  const auto* bytes = reinterpret_cast<const unsigned char*>(name.data());
  for (size_t i = 0; i < name.size();) {
    const size_t length = characterLength(bytes + i, name.size() - i);
    if (length == 0) {
      text += kReplacement;
      ++i;
    } else {
      text.append(name, i, length);
      i += length;
    }
  }
  return text;
}

void Manifest::Add(const std::string& digest, const std::string& name) {
  std::string escaped;
  for (const char c : printable(name)) {
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
