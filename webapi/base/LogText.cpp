#include "webapi/base/LogText.h"

#include <algorithm>

namespace QELO {
namespace {

bool isInsideCharacter(char byte) {
  return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80;
}

}  // namespace

std::string PrintableText(std::string_view text) {
  std::string shown(text);
  std::replace_if(
      shown.begin(), shown.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; }, '?');
  return shown;
}

std::string LogText(std::string_view text) {
  constexpr size_t kLongestTail = 3;  // of a UTF-8 character, behind its first byte
  if (text.size() <= kLongestLogText) {
    return PrintableText(text);
  }
  size_t end = kLongestLogText;
  while (end > kLongestLogText - kLongestTail && isInsideCharacter(text[end])) {
    --end;
  }
  return PrintableText(text.substr(0, end)) + "... (" + std::to_string(text.size()) + " bytes)";
}

}  // namespace QELO
