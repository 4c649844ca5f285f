#include "programs/entry/RestPath.h"

#include "webapi/base/Number.h"
#include "webapi/base/Text.h"

namespace QELO {
namespace {

constexpr std::string_view kPart = "/rest";

}  // namespace

bool RestPath::Read(std::string_view path, RestPath& call) {
  if (path.substr(0, 1) != "/") {
    return false;
  }
  path.remove_prefix(1);
  const std::string_view api = TakePiece(path, "/");
  const std::string_view version = TakePiece(path, "/");
  int number = 0;
  if (api.empty() || path.empty() || path.find('/') != std::string_view::npos ||
      version.substr(0, 1) != "v" || !ParseNumber(version.substr(1), number) || number < 1 ||
      "v" + std::to_string(number) != version) {
    return false;
  }
  call = {std::string(api), number, std::string(path)};
  return true;
}

bool RestPath::IsAddress(std::string_view scriptName, std::string_view pathInfo) {
  return scriptName.ends_with(kPart) ||
         (!pathInfo.empty() && scriptName.find("/rest/") != std::string_view::npos);
}

}  // namespace QELO
