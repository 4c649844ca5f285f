#include "webapi/json/Fault.h"

#include "webapi/JsonHelper.h"
#include "webapi/base/TextFile.h"
#include "webapi/json/Reader.h"

namespace QELO::JsonHelper {

Position positionAt(std::string_view text, size_t offset) {
  Position position;
  for (const char c : text.substr(0, offset)) {
    if (c == '\n') {
      ++position.line;
      position.column = 1;
    } else if ((static_cast<unsigned char>(c) & 0xC0U) != 0x80U) {
      ++position.column;
    }
  }
  return position;
}

bool findFault(std::string_view text, Position& fault) {
  const size_t offset = jsonTextFault(text, {.comments = true});
  if (offset == std::string_view::npos) {
    return false;
  }
  fault = positionAt(text, offset);
  return true;
}

bool findFileFault(const std::string& path, Position& fault) {
  UniqueFd file;
  struct stat info {};
  std::string text;
  return OpenRegularFile(AT_FDCWD, path.c_str(), file, info, 0) == 0 &&
         ReadText(file.Get(), text.max_size(), text) && findFault(text, fault);
}

}  // namespace QELO::JsonHelper
