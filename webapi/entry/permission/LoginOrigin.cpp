#include "webapi/entry/permission/LoginOrigin.h"

#include <strings.h>

#include <cstdlib>
#include <cstring>
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

bool isPost(const APIRequest& request) {
  const char* whole = getenv("REQUEST_METHOD");
  return request.GetRequestMethod() == APIRequest::METHOD_POST &&
         (whole == nullptr || strcmp(whole, "POST") == 0);
}

}  // namespace QELO
