// The sharing check library of the project "files": what a visitor may do by a link to a folder or
// file, which is to look at it and to download it, whole or in parts.

#include <webapi/APIRequest.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>
#include <webapi/SharingLink.h>

#include <string>

namespace {

using QELO::APIRequest;
using QELO::APIResponse;
namespace JsonHelper = QELO::JsonHelper;

constexpr unsigned kMostPaths = 1000;  // as many as one call may name

/// Whether a path is the shared one, or leads below it. One with an empty part, "." or ".." is
/// none, for the API as well as here.
bool IsWithin(const std::string& path, std::string shared) {
  while (!shared.empty() && shared.back() == '/') {
    shared.pop_back();
  }
  const std::string ending = path + "/";
  for (const char* part : {"//", "/./", "/../"}) {
    if (ending.find(part) != std::string::npos) {
      return false;
    }
  }
  return path.rfind(shared, 0) == 0 && (path.size() == shared.size() || path[shared.size()] == '/');
}

bool StaysWithin(APIRequest* request, APIResponse*) {
  const std::string shared =
      JsonHelper::asString(JsonHelper::member(QELO::SharingLink::Of(*request), "path"));
  const auto paths = request->GetAndCheckUnitArray("path");
  if (shared.empty() || shared[0] != '/' || paths.IsInvalid()) {
    return false;
  }
  const Json::Value& list = paths.Get();
  if (list.type() != Json::arrayValue || list.empty() || list.size() > kMostPaths) {
    return false;
  }
  for (const Json::Value& path : list) {
    if (path.type() != Json::stringValue || !IsWithin(JsonHelper::asString(path), shared)) {
      return false;
    }
  }
  return true;
}

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
  static QELO::_tag_API_SHARING_CHECK_TABLE table[] = {
      {"^QELO[.]Files[.]Item$", 1, "^(list|stat|download)$", StaysWithin},
      {nullptr, 0, nullptr, nullptr}};
  return table;
}
