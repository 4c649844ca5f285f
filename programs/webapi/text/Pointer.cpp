#include "programs/webapi/text/Pointer.h"

#include <string>

#include "webapi/JsonHelper.h"
#include "webapi/base/Number.h"
#include "webapi/base/Text.h"

namespace QELO::AuthorProgram {
namespace {

/// "~1" stands for a slash, "~0" for a tilde.
std::string unescaped(std::string_view piece) {
  std::string name;
  for (size_t i = 0; i < piece.size(); ++i) {
    const bool isEscape = piece[i] == '~' && i + 1 < piece.size();
    name += isEscape ? (piece[++i] == '1' ? '/' : '~') : piece[i];
  }
  return name;
}

const Json::Value* partOf(const Json::Value& value, std::string_view piece) {
  Json::ArrayIndex index = 0;
  if (value.isArray() && ParseNumber(piece, index) && index < value.size()) {
    return &value[index];
  }
  return JsonHelper::find(value, unescaped(piece));
}

}  // namespace

const Json::Value& ValueAt(const Json::Value& root, std::string_view pointer) {
  const Json::Value* value = &root;
  TakePiece(pointer, "/");  // what stands before the first slash: nothing
  while (!pointer.empty()) {
    const Json::Value* part = partOf(*value, TakePiece(pointer, "/"));
    if (part == nullptr) {
      return *value;
    }
    value = part;
  }
  return *value;
}

}  // namespace QELO::AuthorProgram
