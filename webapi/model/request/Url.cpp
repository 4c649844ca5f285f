#include <strings.h>

#include <algorithm>

#include "webapi/JsonHelper.h"
#include "webapi/model/request/APIRequestPrivate.h"

namespace QELO {

void APIRequestPrivate::InitRequestMethod() {
  const std::string method = Text("environ", "REQUEST_METHOD");
  int code = APIRequest::METHOD_UNKNOWN;
  if (method == "GET") {
    code = APIRequest::METHOD_GET;
  } else if (method == "POST") {
    code = APIRequest::METHOD_POST;
  } else if (method == "HEAD") {
    code = APIRequest::METHOD_HEAD;
  } else {
    return;
  }
  Put("private", "requestMethod", Json::Int64{code});
}

void APIRequestPrivate::InitURL() {
  if (HasData("url", "initialized")) {
    return;
  }
  SetData("url", "initialized", true, false);
  ParseProtocol();  // first: the port's default depends on it
  ParseHostAndPort();
  ParsePathAndName();
}

void APIRequestPrivate::ParseProtocol() {
  const bool https = strcasecmp(Text("environ", "HTTPS").c_str(), "ON") == 0 ||
                     strcasecmp(Text("environ", "HTTP_X_FORWARDED_PROTO").c_str(), "https") == 0;
  SetData("url", "urlProto", https ? "https" : "http", true);
}

bool APIRequestPrivate::ParseHostAndPort() {
  const std::string text = Text("environ", "HTTP_HOST");
  if (text.empty()) {
    return false;
  }
  size_t hostEnd = std::string::npos;
  size_t colon = std::string::npos;
  if (text.front() == '[') {  // an IPv6 address has colons of its own
    const size_t bracket = text.rfind(']');
    if (bracket == std::string::npos) {
      return false;
    }
    hostEnd = bracket + 1;
    colon = text.find(':', hostEnd);
  } else {
    hostEnd = colon = text.rfind(':');
  }
  std::string port = colon != std::string::npos ? text.substr(colon + 1) : "";
  if (port.empty()) {
    port = Text("url", "urlProto") == "https" ? "443" : "80";
  }
  return SetData("url", "urlHost", text.substr(0, hostEnd), true) &&
         SetData("url", "urlPort", port, true);
}

bool APIRequestPrivate::ParsePathAndName() {
  std::string uri = Text("environ", "REQUEST_URI");
  uri.resize(std::min(uri.find('?'), uri.size()));
  const size_t slash = uri.rfind('/');
  if (slash == std::string::npos) {
    return true;
  }
  return SetData("url", "urlPath", uri.substr(0, slash + 1), true) &&
         SetData("url", "urlName", uri.substr(slash + 1), true);
}

int APIRequestPrivate::GetURLPort(int def) {
  InitURL();
  const int port = Number("url", "urlPort", def);
  return port >= 0 ? port : def;
}

void APIRequestPrivate::InitSharingURL() {
  if (HasData("url", "urlSharing")) {
    return;
  }
  std::string rewriteApp;
  if (JsonHelper::asString(owner_->GetEnv("HOST", "")).empty()) {
    rewriteApp = JsonHelper::asString(owner_->GetEnv("REWRITE_APP", ""));
  }
  std::string url;
  sharing::_tag_SHARING_URL_TYPE type = sharing::SHARING_URL_HOST;
  sharing::GetSharingURL(owner_->GetURLHost(""), owner_->GetURLPort(0),
                         owner_->GetURLProto("http") == "https", owner_->GetURLPath(""), rewriteApp,
                         url, type);
  SetData("url", "urlSharing", url, true);
  sharingUrlType_ = type;
}

}  // namespace QELO
