#include "webapi/model/response/HeaderLines.h"

#include <json/json.h>
#include <strings.h>

#include <algorithm>
#include <cstring>

#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/base/Text.h"

namespace QELO {
namespace {

constexpr char kContentType[] = "Content-type";  // as a fresh response presets it

bool isToken(const std::string& name) {
  return !name.empty() && std::all_of(name.begin(), name.end(), [](char c) {
    return IsAlphanumeric(c) || (c != '\0' && strchr("!#$%&'*+-.^_`|~", c) != nullptr);
  });
}

bool fitsOneLine(const std::string& text) {
  return std::none_of(text.begin(), text.end(),
                      [](char c) { return c == '\r' || c == '\n' || c == '\0'; });
}

bool isContentType(const std::string& name) {
  return strcasecmp(name.c_str(), kContentType) == 0;
}

/// Whether a header makes a line; one that should but cannot is logged.
bool isSendable(const std::string& name, const Json::Value& value, const char* source) {
  if (value.type() != Json::stringValue) {
    return false;
  }
  if (!isToken(name) || !fitsOneLine(JsonHelper::asString(value))) {
    WEBAPI_LOG(source, "header %s is not sent", LogText(name).c_str());
    return false;
  }
  return true;
}

}  // namespace

std::vector<std::string> HeaderLines(const APIResponse& response, const char* source) {
  const Json::Value headers = response.GetHeaders();
  std::vector<std::string> lines;
  std::string contentType;
  size_t contentTypeLine = 0;
  for (auto it = headers.begin(); it != headers.end(); ++it) {
    const char* end = nullptr;
    const char* start = it.memberName(&end);
    const std::string name(start, end);
    if (!isSendable(name, *it, source)) {
      continue;
    }
    const std::string line = name + ": " + JsonHelper::asString(*it);
    if (!isContentType(name)) {
      lines.push_back(line);
    } else if (contentType.empty()) {
      contentType = name;
      contentTypeLine = lines.size();
      lines.push_back(line);
    } else if (contentType == kContentType) {
      contentType = name;
      lines[contentTypeLine] = line;
    }
  }
  return lines;
}

std::vector<std::string> CookieLines(const APIResponse& response) {
  std::vector<std::string> lines;
  const Json::Value cookies = response.GetCookies();
  for (const Json::Value& cookie : cookies) {
    if (!cookie.isString()) {
      continue;
    }
    const std::string text = cookie.asString();
    if (!fitsOneLine(text)) {
      WEBAPI_LOG("WebEntry.cpp", "cookie %s is not sent",
                 LogText(text.substr(0, text.find('='))).c_str());
      continue;
    }
    lines.push_back("Set-Cookie: " + text);
  }
  return lines;
}

}  // namespace QELO
