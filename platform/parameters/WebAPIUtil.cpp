#include "webapi/platform/WebAPIUtil.h"

#include <string_view>
#include <utility>

#include "platform/parameters/PercentCode.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Hex.h"
#include "webapi/base/Text.h"

namespace QELO::WebAPIUtil {
namespace {

bool isUnreserved(char byte) {
  return IsAlphanumeric(byte) || byte == '-' || byte == '_' || byte == '.' || byte == '~';
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
  std::string encoded;
  for (const char byte : text) {
    if (isUnreserved(byte)) {
      encoded += byte;
    } else {
      encoded += '%';
      AppendHex(static_cast<unsigned char>(byte), kUpperHex, encoded);
    }
  }
  return encoded;
}

Json::Value ParseToArray(const char* text, const char* separator) {
  Json::Value pieces(Json::arrayValue);
  std::string_view rest = text != nullptr ? text : "";
  const std::string_view between = separator != nullptr ? separator : "";
  while (!rest.empty()) {
    const std::string_view piece =
        Trim(between.empty() ? std::exchange(rest, {}) : TakePiece(rest, between));
    if (!piece.empty()) {
      pieces.append(Json::Value(piece.data(), piece.data() + piece.size()));
    }
  }
  return pieces;
}

}  // namespace QELO::WebAPIUtil
