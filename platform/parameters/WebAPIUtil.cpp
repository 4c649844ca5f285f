#include "webapi/platform/WebAPIUtil.h"

#include <string_view>

#include "platform/parameters/PercentCode.h"
#include "webapi/JsonHelper.h"

namespace QELO::WebAPIUtil {
namespace {

std::string_view trimmed(std::string_view text) {
  const size_t first = text.find_first_not_of(" \t");
  return first == std::string_view::npos
             ? std::string_view()
             : text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

bool isUnreserved(char byte) {
  return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') ||
         (byte >= '0' && byte <= '9') || byte == '-' || byte == '_' || byte == '.' || byte == '~';
}

}  // namespace

bool ReadJsonFile(const std::string& path, Json::Value& value) {
  return JsonHelper::fromFile(path, value);
}

std::string URLDecode(const std::string& text, bool plusIsBlank) {
  std::string decoded;
  Platform::decodePercent(text, plusIsBlank, decoded);
  return decoded;
}

std::string URLEncode(const std::string& text) {
  constexpr char kDigits[] = "0123456789ABCDEF";
  std::string encoded;
  for (const char byte : text) {
    if (isUnreserved(byte)) {
      encoded += byte;
    } else {
      const auto value = static_cast<unsigned char>(byte);
      encoded += {'%', kDigits[value >> 4U], kDigits[value & 15U]};
    }
  }
  return encoded;
}

Json::Value ParseToArray(const char* text, const char* separator) {
  Json::Value pieces(Json::arrayValue);
  std::string_view rest = text != nullptr ? text : "";
  const std::string_view between = separator != nullptr ? separator : "";
  while (!rest.empty()) {
    const size_t end = between.empty() ? std::string_view::npos : rest.find(between);
    const std::string_view piece = trimmed(rest.substr(0, end));
    rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + between.size());
    if (!piece.empty()) {
      pieces.append(Json::Value(piece.data(), piece.data() + piece.size()));
    }
  }
  return pieces;
}

}  // namespace QELO::WebAPIUtil
