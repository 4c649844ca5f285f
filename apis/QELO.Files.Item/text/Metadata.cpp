#include "text/Metadata.h"

#include <algorithm>

#include "text/Base64.h"

namespace files {

std::string metadataOf(std::string_view header, std::string_view key) {
  while (!header.empty()) {
    const size_t end = std::min(header.find(','), header.size());
    std::string_view pair = header.substr(0, end);
    header.remove_prefix(std::min(end + 1, header.size()));
    pair.remove_prefix(std::min(pair.find_first_not_of(' '), pair.size()));
    const size_t blank = std::min(pair.find(' '), pair.size());
    std::string value;
    if (pair.substr(0, blank) == key &&
        decodeBase64(pair.substr(std::min(blank + 1, pair.size())), value)) {
      return value;
    }
  }
  return "";
}

bool isPlain(std::string_view text) {
  return std::all_of(text.begin(), text.end(), [](char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
           c == '_' || c == '.' || c == '~';
  });
}

}  // namespace files
