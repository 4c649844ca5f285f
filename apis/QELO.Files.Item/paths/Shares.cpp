#include "paths/Shares.h"

#include <sys/stat.h>
#include <unistd.h>
#include <webapi/JsonHelper.h>

#include <algorithm>

#include "paths/VirtualPath.h"

namespace files {
namespace {

namespace JsonHelper = QELO::JsonHelper;

constexpr char kUserMark[] = "{user}";
constexpr char kAdministrators[] = "@administrators";

/// Whether nobody but root and the process's user may change a file or directory.
bool isBelieved(const struct stat& info) {
  return (info.st_uid == 0 || info.st_uid == geteuid()) &&
         (info.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

bool readConfiguration(const std::string& file, Json::Value& configuration) {
  struct stat info {};
  struct stat folder {};
  const std::string around = file.substr(0, file.rfind('/') + 1);
  return !around.empty() && lstat(file.c_str(), &info) == 0 && S_ISREG(info.st_mode) &&
         static_cast<size_t>(info.st_size) <= Shares::kLargestFile && isBelieved(info) &&
         stat(around.c_str(), &folder) == 0 && isBelieved(folder) &&
         JsonHelper::fromFile(file, configuration);
}

bool isFor(const Json::Value& users, const std::string& user, bool isAdministrator) {
  if (users.isNull()) {
    return true;
  }
  return users.isArray() && std::any_of(users.begin(), users.end(), [&](const Json::Value& entry) {
           return JsonHelper::isText(entry, user) ||
                  (isAdministrator && JsonHelper::isText(entry, kAdministrators));
         });
}

/// @return false when the path cannot be one of this user's
bool putUser(const std::string& user, std::string& path) {
  const size_t mark = path.find(kUserMark);
  if (mark == std::string::npos) {
    return true;
  }
  path.replace(mark, sizeof kUserMark - 1, user);
  return isNewName(user);  // "..", a "/" or a NUL would lead elsewhere
}

bool readShare(const Json::Value& entry, const std::string& user, Share& share) {
  share.name = JsonHelper::asString(JsonHelper::member(entry, "name"));
  share.path = JsonHelper::asString(JsonHelper::member(entry, "path"));
  share.comment = JsonHelper::asString(JsonHelper::member(entry, "comment"));
  const Json::Value& readOnly = JsonHelper::member(entry, "read_only");
  share.isReadOnly = !(readOnly.isNull() || (readOnly.isBool() && !readOnly.asBool()));
  return isNewName(share.name) && share.path.starts_with('/') &&
         share.path.size() <= VirtualPath::kLongest && putUser(user, share.path);
}

}  // namespace

Shares::Shares(const std::string& file, const std::string& user, bool isAdministrator) {
  Json::Value configuration;
  if (user.empty() || !readConfiguration(file, configuration)) {
    return;
  }
  const Json::Value& entries = JsonHelper::member(configuration, "shares");
  if (!entries.isArray()) {
    return;
  }
  for (Json::ArrayIndex i = 0; i < entries.size() && i < kMost; ++i) {
    Share share;
    if (readShare(entries[i], user, share) && Find(share.name) == nullptr &&
        isFor(JsonHelper::member(entries[i], "users"), user, isAdministrator)) {
      shares_.push_back(std::move(share));
    }
  }
}

const Share* Shares::Find(const std::string& name) const {
  const auto found = std::find_if(shares_.begin(), shares_.end(),
                                  [&](const Share& share) { return share.name == name; });
  return found != shares_.end() ? &*found : nullptr;
}

}  // namespace files
