#include <string_view>
#include <utility>

#include "platform/parameters/JsonText.h"
#include "platform/parameters/PercentCode.h"
#include "webapi/base/Text.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::Platform {
namespace {

bool take(std::string_view text, bool decode, std::string& plain) {
  if (decode) {
    return decodePercent(text, true, plain);
  }
  plain = text;
  return true;
}

/// Takes the pairs of a line, one after the other.
class Pairs {
 public:
  Pairs(bool decode, bool parseJson) : decode_(decode), parseJson_(parseJson) {}

  /// @return false when the pair is malformed, or one too many
  bool Take(std::string_view pair) {
    const size_t equals = std::min(pair.find('='), pair.size());
    std::string name;
    std::string text;
    if (parametersLeft_ == 0 || !take(pair.substr(0, equals), decode_, name) ||
        !take(pair.substr(std::min(equals + 1, pair.size())), decode_, text)) {
      return false;
    }
    --parametersLeft_;
    return Read(text, *pairs_.demand(name.data(), name.data() + name.size()));
  }

  void MoveTo(Json::Value& object) {
    if (object.empty()) {
      object.swap(pairs_);
      return;
    }
    for (auto pair = pairs_.begin(); pair != pairs_.end(); ++pair) {
      object[pair.name()].swap(*pair);
    }
  }

 private:
  bool Read(const std::string& text, Json::Value& value) {
    const JsonText found = parseJson_ ? readJsonText(text, value, valuesLeft_) : JsonText::kOther;
    if (found != JsonText::kOther) {
      return found == JsonText::kValue;
    }
    if (valuesLeft_ == 0) {
      return false;
    }
    --valuesLeft_;
    value = Json::Value(text);
    return true;
  }

  bool decode_;
  bool parseJson_;
  size_t parametersLeft_ = QELO::WebAPIUtil::kMostParameters;
  size_t valuesLeft_ = QELO::WebAPIUtil::kMostValues;
  Json::Value pairs_{Json::objectValue};
};

}  // namespace
}  // namespace QELO::Platform

bool QELO::WebAPIUtil::strPairToJsonObj(const std::string& line, Json::Value& object, bool decode,
                                        bool parseJson) {
  const bool isObject = object.type() == Json::objectValue;
  const bool isEmpty = object.type() == Json::nullValue || (isObject && object.size() == 0);
  if (!isEmpty && !isObject) {
    return false;
  }
  Platform::Pairs pairs(decode, parseJson);
  for (std::string_view rest = line; !rest.empty();) {
    const std::string_view pair = TakePiece(rest, "&");
    if (!pair.empty() && !pairs.Take(pair)) {
      return false;
    }
  }
  pairs.MoveTo(object);
  return true;
}
