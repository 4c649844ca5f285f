#include "platform/relay/KnownHosts.h"

#include <json/json.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstring>

#include "platform/base/Paths.h"
#include "platform/base/Secrets.h"
#include "platform/relay/RelayCall.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/OwnFile.h"
#include "webapi/base/TextFile.h"

namespace QELO::Platform {
namespace {

constexpr size_t kLargestTable = 1 << 20;  // bytes
constexpr long kDefaultTimeout = 300;      // seconds
constexpr char kProtocol[] = "https://";
constexpr char kPinMark[] = "sha256//";
constexpr const char* kKeys[] = {"url", "token", "trust", "pin", "timeout"};

/// Tokens stand in it, so that nobody else may read it either.
bool readTable(Json::Value& table, std::string& reason) {
  UniqueFd file;
  struct stat info {};
  std::string text;
  const int error = OpenRegularFile(AT_FDCWD, Paths::kRelayHosts, file, info);
  if (error != 0) {
    reason = strerror(error);
  } else if (OthersMayChange(Paths::kRelayHosts) || (info.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
    reason = "others may read or write it";
  } else if (!ReadText(file.Get(), kLargestTable, text) || !JsonHelper::fromString(text, table) ||
             !table.isObject()) {
    reason = "it is no JSON object";
  }
  return reason.empty();
}

bool isPlain(const std::string& text) {
  return std::all_of(text.begin(), text.end(), [](char c) { return c > ' ' && c < '\x7f'; });
}

bool startsWith(const std::string& text, const char* start) {
  return text.compare(0, strlen(start), start) == 0;
}

/// A query, or an account in it, would be sent to the other host.
bool isAddress(const std::string& url) {
  return startsWith(url, kProtocol) && url.size() > strlen(kProtocol) && isPlain(url) &&
         url.find_first_of("?#@\\") == std::string::npos;
}

bool isText(const Json::Value& entry, const char* key) {
  const Json::Value& value = JsonHelper::member(entry, key);
  return value.isNull() || value.isString();
}

/// Misspelt keys may be those that were to keep somebody out.
bool hasKnownKeys(const Json::Value& entry) {
  for (auto it = entry.begin(); it != entry.end(); ++it) {
    const std::string name = it.name();
    if (std::none_of(std::begin(kKeys), std::end(kKeys),
                     [&](const char* key) { return name == key; })) {
      return false;
    }
  }
  return isText(entry, "url") && isText(entry, "token") && isText(entry, "trust") &&
         isText(entry, "pin");
}

}  // namespace

bool findRelayHost(long number, RelayHost& host, std::string& reason) {
  Json::Value table;
  reason.clear();
  if (!readTable(table, reason)) {
    reason = std::string(Paths::kRelayHosts) + ": " + reason;
    return false;
  }
  const Json::Value& entry = JsonHelper::member(table, std::to_string(number));
  if (!entry.isObject()) {
    reason = "there is no such host";
    return false;
  }
  const Json::Value& timeout = JsonHelper::member(entry, "timeout");
  RelayHost found{JsonHelper::asString(JsonHelper::member(entry, "url")),
                  JsonHelper::asString(JsonHelper::member(entry, "token")),
                  JsonHelper::asString(JsonHelper::member(entry, "trust")),
                  JsonHelper::asString(JsonHelper::member(entry, "pin")),
                  timeout.isNull() ? kDefaultTimeout : JsonHelper::asInt(timeout, -1)};
  if (!hasKnownKeys(entry)) {
    reason = "its entry has other keys than it should, or of a wrong type";
  } else if (!isAddress(found.url)) {
    reason = "its \"url\" is no plain address that begins with https://";
  } else if (!isSecretText(found.token)) {
    reason = "its \"token\" is no access token";
  } else if (!found.pin.empty() && (!startsWith(found.pin, kPinMark) || !isPlain(found.pin))) {
    reason = "its \"pin\" does not begin with sha256//";
  } else if (found.timeout < 1 || found.timeout > kLongestTimeout) {
    reason = "its \"timeout\" is no number of seconds from 1 to 3600";
  } else if (!found.trust.empty()) {
    found.trust = Paths::kRootPrefix + found.trust;
    struct stat info {};
    if (stat(found.trust.c_str(), &info) != 0 || OthersMayChange(found.trust)) {
      reason = "its \"trust\" is missing, or others may write it or its directory";
    }
  }
  if (!reason.empty()) {
    return false;
  }
  host = found;
  return true;
}

}  // namespace QELO::Platform
