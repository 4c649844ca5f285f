#include "programs/webapi/text/DescriptionText.h"

#include <cerrno>
#include <cstring>
#include <utility>

#include "programs/webapi/Arguments.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/TextFile.h"
#include "webapi/json/Reader.h"

namespace QELO::AuthorProgram {

std::string PlaceText(const std::string& path, const JsonHelper::Position& position) {
  return Shown(path) + ":" + std::to_string(position.line) + ":" + std::to_string(position.column) +
         ": ";
}

std::string TooMuchIn(const Json::Value& description) {
  const Json::Value& methods = JsonHelper::member(description, "methods");
  const std::string most = "more than " + std::to_string(kMostEntries);
  if (methods.isObject() && methods.size() > kMostEntries) {
    return "it has " + most + " versions";
  }
  for (auto it = methods.begin(); methods.isObject() && it != methods.end(); ++it) {
    if (it->isArray() && it->size() > kMostEntries) {
      return "version " + Shown(it.name()) + " has " + most + " methods";
    }
  }
  return "";
}

std::string DescriptionText::ReadFile(const std::string& path) {
  UniqueFd file;
  struct stat info {};
  const int error = OpenRegularFile(AT_FDCWD, path.c_str(), file, info, 0);
  if (error != 0) {
    return Shown(path) + ": " + (error == EINVAL ? "it is no regular file" : strerror(error));
  }
  std::string text;
  if (!QELO::ReadText(file.Get(), kLongest, text)) {
    return Shown(path) + ": it is larger than " + std::to_string(kLongest >> 20U) +
           " MiB, or cannot be read";
  }
  return ReadText(path, std::move(text));
}

std::string DescriptionText::ReadText(const std::string& path, std::string text) {
  text_ = std::move(text);
  const JsonHelper::Reading how{.comments = true, .maxValues = kMostValues};
  switch (JsonHelper::readJsonText(text_, how, root_)) {
    case JsonHelper::ReadResult::kRead:
      twices_ = Locate(text_, root_);
      return "";
    case JsonHelper::ReadResult::kTooMany:
      return Shown(path) + ": it has more than " + std::to_string(kMostValues) + " values";
    default:
      JsonHelper::Position fault;
      JsonHelper::findFault(text_, fault);
      return PlaceText(path, fault) + "error: no JSON from here on";
  }
}

}  // namespace QELO::AuthorProgram
