#include "text/Base64.h"

namespace files {

bool decodeBase64(std::string_view text, std::string& bytes) {
  constexpr std::string_view kDigits =
      "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  std::string decoded;
  unsigned bits = 0;
  int count = 0;
  const size_t end = text.find_last_not_of('=') + 1;
  if (end % 4 == 1 || text.size() - end > 2) {
    return false;
  }
  for (const char c : text.substr(0, end)) {
    const size_t value = kDigits.find(c);
    if (value == std::string_view::npos) {
      return false;
    }
    bits = (bits << 6 | static_cast<unsigned>(value)) & 0xFFFFFF;
    count += 6;
    if (count >= 8) {
      count -= 8;
      decoded += static_cast<char>(bits >> count & 0xFF);
    }
  }
  bytes = decoded;
  return true;
}

}  // namespace files
