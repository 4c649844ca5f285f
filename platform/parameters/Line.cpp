#include <string_view>
#include <utility>

#include "platform/parameters/JsonText.h"
#include "platform/parameters/PercentCode.h"
#include "webapi/base/Text.h"
#include "webapi/platform/WebAPIUtil.h"

namespace {

bool take(std::string_view text, bool decode, std::string& plain) {
  if (decode) {
    return QELO::Platform::decodePercent(text, true, plain);
  }
  plain = text;
  return true;
}

}  // namespace

bool QELO::WebAPIUtil::strPairToJsonObj(const std::string& line, Json::Value& object, bool decode,
                                        bool parseJson) {
  const bool isObject = object.type() == Json::objectValue;
  const bool isEmpty = object.type() == Json::nullValue || (isObject && object.size() == 0);
  if (!isEmpty && !isObject) {
    return false;
  }
  Json::Value pairs(Json::objectValue);
  std::string_view rest = line;
  while (!rest.empty()) {
    const std::string_view pair = TakePiece(rest, "&");
    if (pair.empty()) {
      continue;
    }
    const size_t equals = std::min(pair.find('='), pair.size());
    std::string name;
    std::string text;
    if (!take(pair.substr(0, equals), decode, name) ||
        !take(pair.substr(std::min(equals + 1, pair.size())), decode, text)) {
      return false;
    }
    Json::Value& value = *pairs.demand(name.data(), name.data() + name.size());
    if (!parseJson || !Platform::parseJsonText(text, value)) {
      value = Json::Value(text.data(), text.data() + text.size());
    }
  }
  if (isEmpty) {
    object.swap(pairs);
    return true;
  }
  const Json::Value& taken = pairs;
  for (auto it = taken.begin(); it != taken.end(); ++it) {
    const char* end = nullptr;
    const char* name = it.memberName(&end);
    *object.demand(name, end) = *it;
  }
  return true;
}
