// The sharing check library of the project "files": what a visitor may do by a link to a folder or
// file, which is to look at it and to download it, whole or in parts, and to bring files where the
// link says so.

#include <webapi/APIRequest.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>
#include <webapi/SharingLink.h>

#include <string>

#include "Scope.h"

namespace {

using QELO::APIRequest;
using QELO::APIResponse;
namespace JsonHelper = QELO::JsonHelper;

constexpr unsigned kMostPaths = 1000;  // as many as one call may name

bool StaysWithin(APIRequest* request, APIResponse*) {
  const std::string shared =
      JsonHelper::asString(JsonHelper::member(QELO::SharingLink::Of(*request), "path"));
  const auto paths = request->GetAndCheckUnitArray("path");
  if (paths.IsInvalid()) {
    return false;
  }
  const Json::Value& list = paths.Get();
  if (list.type() != Json::arrayValue || list.empty() || list.size() > kMostPaths) {
    return false;
  }
  for (const Json::Value& path : list) {
    if (path.type() != Json::stringValue || !files::isWithin(JsonHelper::asString(path), shared)) {
      return false;
    }
  }
  return true;
}

/// The form, which may name another path, has not come yet: the method looks again.
bool MayBring(APIRequest* request, APIResponse* response) {
  const Json::Value link = QELO::SharingLink::Of(*request);
  return JsonHelper::member(link, "upload") == Json::Value(true) && StaysWithin(request, response);
}

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
  static QELO::_tag_API_SHARING_CHECK_TABLE table[] = {
      {"^QELO[.]Files[.]Item$", 1, "^list$", StaysWithin},
      {"^QELO[.]Files[.]Item$", 1, "^stat$", StaysWithin},
      {"^QELO[.]Files[.]Item$", 1, "^download$", StaysWithin},
      {"^QELO[.]Files[.]Item$", 1, "^upload$", MayBring},
      {nullptr, 0, nullptr, nullptr}};
  return table;
}
