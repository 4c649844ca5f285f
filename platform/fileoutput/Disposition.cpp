// The header that names a file to save by: RFC 6266, with RFC 8187 for names that are not ASCII.

#include <algorithm>
#include <cstring>
#include <iterator>
#include <string>
#include <string_view>

#include "webapi/base/Hex.h"
#include "webapi/base/Text.h"
#include "webapi/base/Utf8.h"
#include "webapi/platform/FileOutput.h"

namespace QELO::HTTP {
namespace {

constexpr size_t kLongestName = 255;  ///< bytes that file systems give a name
/// Marks that turn the direction of a text, so that "exe.txt" may be seen where "txt.exe" stands.
constexpr std::string_view kDirectionMarks[] = {"\u061c", "\u200e", "\u200f", "\u202a",
                                                "\u202b", "\u202c", "\u202d", "\u202e",
                                                "\u2066", "\u2067", "\u2068", "\u2069"};

constexpr bool isContinuation(char c) {
  return (static_cast<unsigned char>(c) & 0xc0U) == 0x80U;
}

/// The name's last part, at most kLongestName bytes of it, with "_" for what no name should hold.
std::string safeName(const std::string& name) {
  std::string safe = RepairUtf8(name.substr(name.rfind('/') + 1));
  if (safe.size() > kLongestName) {
    size_t end = kLongestName;
    while (end > 0 && isContinuation(safe[end])) {
      --end;
    }
    safe.resize(end);
  }
  for (const std::string_view mark : kDirectionMarks) {
    for (size_t at = safe.find(mark); at != std::string::npos; at = safe.find(mark, at)) {
      safe.replace(at, mark.size(), "_");
    }
  }
  std::replace_if(
      safe.begin(), safe.end(),
      [](char c) { return static_cast<unsigned char>(c) < ' ' || c == '\x7f' || c == '\\'; }, '_');
  return safe;
}

/// What old clients, which know no other form, take for the name. They read escapes in it, too.
std::string asciiName(const std::string& name) {
  std::string ascii;
  for (const char c : name) {
    const bool isPlain = c >= ' ' && c <= '~' && c != '"' && c != '%';
    if (!isContinuation(c)) {
      ascii += isPlain ? c : '_';
    }
  }
  return ascii;
}

std::string encoded(const std::string& name) {
  std::string text;
  for (const char c : name) {
    if (IsAlphanumeric(c) || (c != '\0' && strchr("!#$&+-.^_`|~", c) != nullptr)) {
      text += c;
    } else {
      text += '%';
      AppendHex(static_cast<unsigned char>(c), kUpperHex, text);
    }
  }
  return text;
}

}  // namespace

std::string FileOutputerHelper::ContentDisposition(const std::string& name, bool isInline) {
  std::string value = isInline ? "inline" : "attachment";
  const std::string safe = safeName(name);
  if (safe.empty()) {
    return value;
  }
  const std::string ascii = asciiName(safe);
  value += "; filename=\"" + ascii + "\"";
  if (ascii != safe) {
    value += "; filename*=UTF-8''" + encoded(safe);
  }
  return value;
}

}  // namespace QELO::HTTP
