#include "webapi/entry/permission/LoginOrigin.h"

#include <strings.h>

#include <string>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"

namespace QELO {
namespace {

/// The host of "scheme://host:port", an IPv6 literal with its brackets; "" when there is none.
std::string hostOf(const std::string& origin) {
  const size_t scheme = origin.find("://");
  if (scheme == std::string::npos) {
    return "";
  }
  const std::string rest = origin.substr(scheme + 3);
  const size_t bracket = rest.find(']');
  return rest.substr(0, bracket != std::string::npos ? bracket + 1 : rest.find(':'));
}

}  // namespace

bool comesFromAnotherSite(const APIRequest& request) {
  const std::string site = JsonHelper::asString(request.GetEnv("HTTP_SEC_FETCH_SITE"));
  if (!site.empty()) {
    return site == "cross-site";
  }
  const std::string origin = JsonHelper::asString(request.GetEnv("HTTP_ORIGIN"));
  return !origin.empty() && strcasecmp(hostOf(origin).c_str(), request.GetURLHost("").c_str()) != 0;
}

}  // namespace QELO
