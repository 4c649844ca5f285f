#include <syslog.h>

#include <algorithm>
#include <ctime>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/LogText.h"
#include "webapi/base/Text.h"
#include "webapi/model/response/APIResponsePrivate.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

constexpr long kSecondsPerMinute = 60;
constexpr time_t kLastCookieTime = 253402300799;  // the end of year 9999: years have four digits
constexpr int kExpirySize = 1024;

bool isNameCharacter(char c) {
  return IsAlphanumeric(c) || c == '_' || c == '-';
}

/// base plus minutes, within what a cookie's date can say.
time_t laterBy(time_t base, long minutes) {
  time_t seconds = 0;
  time_t sum = 0;
  if (__builtin_mul_overflow(minutes, kSecondsPerMinute, &seconds) ||
      __builtin_add_overflow(base, seconds, &sum)) {
    return kLastCookieTime;
  }
  return std::clamp<time_t>(sum, 0, kLastCookieTime);
}

}  // namespace

bool APIResponsePrivate::AddCookie(const std::string& name, const std::string& value,
                                   const std::string& path, long expireMinutes,
                                   const std::string& domain, bool secure, bool httpOnly) {
  if (name.empty() || path.empty()) {
    return false;
  }
  if (!std::all_of(name.begin(), name.end(), isNameCharacter)) {
    syslog(LOG_ERR, "%s(%d)%s: key[%s] contains invalid character", "APIResponse.cpp", __LINE__,
           "AddCookie", LogText(name).c_str());
    return false;
  }
  std::string line = name + "=" + WebAPIUtil::URLEncode(value) + "; path=" + path;
  line += CookieExpiry(expireMinutes);
  if (!domain.empty()) {
    line += "; domain=" + domain;
  }
  line += secure ? "; secure" : "";
  line += httpOnly ? "; httponly" : "";
  return AppendCookie(line);
}

std::string APIResponsePrivate::CookieExpiry(long minutes) const {
  if (minutes == 0) {
    return "";
  }
  if (minutes < 0) {
    return "; expires=Thu, 01-Jan-1970 00:00:01 GMT";
  }
  time_t base = time(nullptr);
  if (request_ != nullptr && request_->HasParam("client_time")) {
    base = JsonHelper::asInt64(request_->GetParam("client_time"), base);
  }
  const time_t expiry = laterBy(base, minutes);
  struct tm parts {};
  char text[kExpirySize] = {};
  gmtime_r(&expiry, &parts);
  strftime(text, sizeof text, "%a, %d-%b-%Y %H:%M:%S GMT", &parts);
  return std::string("; expires=") + text;
}

bool APIResponsePrivate::AppendCookie(const std::string& line) {
  if (!JsonHelper::hasMember(store_, "setCookie")) {
    return false;
  }
  Json::Value& cookies = store_["setCookie"];
  if (!cookies.isArray() && !cookies.isNull()) {
    return false;
  }
  cookies.append(line);
  return true;
}

}  // namespace QELO
