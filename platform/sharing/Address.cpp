#include "webapi/platform/Sharing.h"

namespace QELO::sharing {

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
    url += path.empty() ? "/" : path;
  }
  url += "sharing/";
  return true;
}

}  // namespace QELO::sharing
