#include "webapi/platform/Sharing.h"

#include <algorithm>

namespace QELO::sharing {
namespace {

/// The path that the program and the page stand below. An address a method,
/// ".../rest/API/vN/METHOD", is the program's, too.
std::string pathOfFront(const std::string& path) {
  const size_t rest = path.rfind("/rest/");
  const bool isMethods = rest != std::string::npos &&
                         std::count(path.begin() + static_cast<long>(rest), path.end(), '/') == 4;
  return isMethods ? path.substr(0, rest + 1) : path;
}

}  // namespace

bool GetSharingURL(const std::string& host, int port, bool isHttps, const std::string& path,
                   const std::string& rewriteApp, std::string& url, _tag_SHARING_URL_TYPE& type) {
  const int ownPort = isHttps ? 443 : 80;
  type = rewriteApp.empty() ? SHARING_URL_HOST : SHARING_URL_REWRITE;
  url.clear();
  if (host.empty()) {
    return false;
  }
  url = (isHttps ? "https://" : "http://") + host;
  if (port > 0 && port != ownPort) {
    url += ":" + std::to_string(port);
  }
  if (!rewriteApp.empty()) {
    url += "/" + rewriteApp + "/";
  } else {
    url += path.empty() ? "/" : pathOfFront(path);
  }
  url += "sharing/";
  return true;
}

}  // namespace QELO::sharing
