#include "webapi/json/SchemaReference.h"

#include <string>
#include <string_view>

#include "webapi/JsonHelper.h"
#include "webapi/base/Number.h"
#include "webapi/base/Text.h"

namespace QELO {
namespace {

/// "~1" and "~0" of a JSON pointer's part.
std::string plain(std::string_view part) {
  std::string text;
  for (size_t i = 0; i < part.size(); ++i) {
    const bool isEscape = part[i] == '~' && i + 1 < part.size();
    const char next = isEscape ? part[i + 1] : '\0';
    if (next == '0' || next == '1') {
      text += next == '0' ? '~' : '/';
      ++i;
    } else {
      text += part[i];
    }
  }
  return text;
}

const Json::Value* step(const Json::Value& from, const std::string& name) {
  Json::ArrayIndex index = 0;
  if (from.isArray()) {
    return ParseNumber(name, index) && from.isValidIndex(index) ? &from[index] : nullptr;
  }
  return JsonHelper::find(from, name);
}

}  // namespace

const Json::Value* FindReferred(const Json::Value& root, const Json::Value& schema) {
  constexpr int kMost = 32;  // references to references
  const Json::Value* at = &schema;
  for (int i = 0; i < kMost; ++i) {
    const Json::Value* reference = JsonHelper::find(*at, "$ref");
    if (reference == nullptr) {
      return at;
    }
    const std::string text = JsonHelper::asString(*reference);
    std::string_view way = text;
    if (way.substr(0, 1) != "#" || (way.size() > 1 && way[1] != '/')) {
      return nullptr;
    }
    way.remove_prefix(way.size() > 1 ? 2 : 1);
    at = &root;
    for (bool isMore = !way.empty(); isMore && at != nullptr;) {
      isMore = way.find('/') != std::string_view::npos;
      at = step(*at, plain(TakePiece(way, "/")));
    }
    if (at == nullptr) {
      return nullptr;
    }
  }
  return nullptr;
}

}  // namespace QELO
