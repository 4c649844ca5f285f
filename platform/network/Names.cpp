#include <arpa/inet.h>
#include <strings.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <string_view>

#include "platform/network/Punycode.h"
#include "webapi/platform/Network.h"

namespace {

constexpr size_t kMaxName = 253;  ///< characters that fit into the 255 bytes of a name on the wire
constexpr size_t kMaxLabel = 63;
constexpr char kAsciiForm[] = "xn--";  ///< in front of an internationalised label

// Not isalnum(), which goes by the locale that a method may have set.
bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

bool isInner(char c) {
  const char lower = static_cast<char>(c | 0x20);
  return isDigit(c) || (lower >= 'a' && lower <= 'z') || c == '-';
}

bool isLabel(std::string_view label) {
  if (label.empty() || label.size() > kMaxLabel || label.front() == '-' || label.back() == '-' ||
      !std::all_of(label.begin(), label.end(), isInner)) {
    return false;
  }
  constexpr size_t kMark = sizeof kAsciiForm - 1;
  return label.size() < kMark || strncasecmp(label.data(), kAsciiForm, kMark) != 0 ||
         QELO::Platform::isPunycode(label.substr(kMark));
}

bool isName(const std::string& text) {
  const std::string_view name = text;
  size_t start = 0;
  for (size_t dot = name.find('.'); dot != std::string_view::npos; dot = name.find('.', start)) {
    if (!isLabel(name.substr(start, dot - start))) {
      return false;
    }
    start = dot + 1;
  }
  const std::string_view last = name.substr(start);
  in_addr address{};
  return isLabel(last) && !std::all_of(last.begin(), last.end(), isDigit) &&
         inet_aton(text.c_str(), &address) == 0;
}

}  // namespace

extern "C" {

int BlQLIBIsHostname(const char* text) {
  return text != nullptr && strnlen(text, kMaxName + 1) <= kMaxName && isName(text) ? 1 : 0;
}

int BlQLIBIsDomain(const char* text) {
  if (text == nullptr) {
    return 0;
  }
  std::string name(text, strnlen(text, kMaxName + 2));
  if (!name.empty() && name.back() == '.') {
    name.pop_back();
  }
  return name.size() <= kMaxName && isName(name) ? 1 : 0;
}

}  // extern "C"
