#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIRequest.h"

/// A request with this user-agent header and perhaps a cookie line.
inline QELO::APIRequest requestOf(const std::string& userAgent, const std::string& cookies = "") {
  Json::Value init;
  init["environ"]["HTTP_USER_AGENT"] = userAgent;
  if (!cookies.empty()) {
    init["environ"]["HTTP_COOKIE"] = cookies;
  }
  return QELO::APIRequest(init);
}

/// The queries that answer true, without "Is", in the order in which their flags are kept; "" when
/// none does.
inline std::string devices(const QELO::APIRequest& request) {
  std::string found;
  const auto take = [&found](bool yes, const char* name) {
    found += yes ? (found.empty() ? "" : " ") + std::string(name) : "";
  };
  take(request.IsMobile(), "Mobile");
  take(request.IsMobileDevice(), "MobileDevice");
  take(request.IsIPhone(), "IPhone");
  take(request.IsAndroid(), "Android");
  take(request.IsIEMobile(), "IEMobile");
  take(request.IsIPad(), "IPad");
  take(request.IsPlayBook(), "PlayBook");
  take(request.IsBlackBerry6(), "BlackBerry6");
  take(request.IsWebKit(), "WebKit");
  take(request.IsSupportWebApp(), "SupportWebApp");
  return found;
}

inline std::string devices(const std::string& userAgent) {
  return devices(requestOf(userAgent));
}
