#include "platform/login/SessionStore.h"

#include <fcntl.h>
#include <json/json.h>
#include <time.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "platform/base/Paths.h"
#include "platform/base/PrivateDir.h"
#include "platform/base/Secrets.h"
#include "platform/login/SessionIndex.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/base/ReplaceFile.h"
#include "webapi/base/TextFile.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "SessionStore.cpp";
constexpr size_t kLargestRecord = 4096;  // bytes
constexpr long kPurgeFactor = 10;        // times the idle time-out
constexpr long kSecondNs = 1'000'000'000;

bool parseRecord(const std::string& text, Session& session) {
  Json::Value record;
  if (!JsonHelper::fromString(text, record)) {
    return false;
  }
  const auto string = [&record](const char* key) {
    const Json::Value& value = JsonHelper::member(record, key);
    return value.type() == Json::stringValue ? JsonHelper::asString(value) : std::string();
  };
  session.user = string("user");
  const Json::Value& uid = JsonHelper::member(record, "uid");
  session.uid = uid.isUInt() ? uid.asUInt() : Session::kNobody;
  session.address = string("address");
  session.token = string("token");
  session.skipCheckIp = JsonHelper::asBool(JsonHelper::member(record, "skipCheckIP"));
  session.application = string("app");
  session.webApi = string("webapi");
  return !session.user.empty() && isSecretText(session.token);
}

std::string recordText(const Session& session, const std::string& token) {
  Json::Value record(Json::objectValue);
  record["user"] = session.user;
  record["uid"] = session.uid;
  record["address"] = session.address;
  record["token"] = token;
  record["created"] = static_cast<Json::Int64>(time(nullptr));
  if (session.skipCheckIp) {
    record["skipCheckIP"] = true;
  }
  return JsonHelper::toString(record);
}

/// Readers see the whole record or none.
bool writeRecord(int dir, const std::string& id, const std::string& text, SessionIndex& index) {
  if (!ReplaceFile(id, text, {.directory = dir})) {
    return false;
  }
  if (!index.Add(id)) {
    const int error = errno;
    unlinkat(dir, id.c_str(), 0);
    errno = error;
    return false;
  }
  return true;
}

}  // namespace

long secondsLeft(const timespec& lastUse, int timeout) {
  const long idle = time(nullptr) - lastUse.tv_sec;
  return timeout - std::max(idle, 0L);
}

bool Session::Refresh() {
  timespec now{};
  clock_gettime(CLOCK_REALTIME, &now);
  const long long age = (now.tv_sec - lastUse.tv_sec) * static_cast<long long>(kSecondNs) +
                        now.tv_nsec - lastUse.tv_nsec;
  return (age >= 0 && age < kSecondNs) || futimens(file.Get(), nullptr) == 0;
}

SessionStore::SessionStore(bool create) : dir_(openPrivateDir(Paths::kSessionDir, create)) {
  dirError_ = dir_ ? 0 : errno;
}

SessionStore::Result SessionStore::Read(const std::string& id, Session& session) const {
  if (!isSecretText(id)) {
    return Result::kMalformed;
  }
  if (!dir_ && dirError_ == ENOENT) {
    return Result::kAbsent;  // nobody has ever logged in
  }
  if (!dir_) {
    WEBAPI_LOG(kSource, "cannot use %s [%s]", Paths::kSessionDir, strerror(dirError_));
    return Result::kBroken;
  }
  UniqueFd file;
  struct stat info {};
  const int error = OpenRegularFile(dir_.Get(), id.c_str(), file, info);
  if (error != 0) {
    return error == ENOENT ? Result::kAbsent : Result::kBroken;
  }
  std::string text;
  Session found;
  if (!ReadText(file.Get(), kLargestRecord, text) || !parseRecord(text, found)) {
    return Result::kBroken;
  }
  found.file = std::move(file);
  found.lastUse = info.st_mtim;
  session = std::move(found);
  return Result::kGood;
}

SessionStore::Result SessionStore::ReadLastUse(const std::string& id, timespec& lastUse) {
  if (!isSecretText(id)) {
    return Result::kMalformed;
  }
  struct stat info {};
  const std::string path = std::string(Paths::kSessionDir) + "/" + id;
  if (lstat(path.c_str(), &info) != 0 || !S_ISREG(info.st_mode)) {
    return Result::kAbsent;
  }
  lastUse = info.st_mtim;
  return Result::kGood;
}

bool SessionStore::Create(const Session& session, size_t limit, std::string& id,
                          std::string& token) const {
  if (!dir_) {
    WEBAPI_LOG(kSource, "cannot use %s [%s]", Paths::kSessionDir, strerror(dirError_));
    return false;
  }
  id = makeSecret();
  token = makeSecret();
  if (id.empty() || token.empty()) {
    WEBAPI_LOG(kSource, "no random bytes [%s]", strerror(errno));
    return false;
  }
  SessionIndex index(dir_.Get(), session.user, session.uid);
  if (!writeRecord(dir_.Get(), id, recordText(session, token), index)) {
    WEBAPI_LOG(kSource, "cannot write a session [%s]", strerror(errno));
    return false;
  }
  index.Cap(limit, id);
  return true;
}

bool SessionStore::Remove(const std::string& id) const {
  if (!isSecretText(id) || !dir_) {
    return false;
  }
  Session session;
  if (Read(id, session) == Result::kGood) {
    SessionIndex(dir_.Get(), session.user, session.uid).Remove(id);
  }
  return unlinkat(dir_.Get(), id.c_str(), 0) == 0;
}

void SessionStore::Purge(int timeout, int pause) const {
  const std::optional<PurgeShare> share =
      dir_ ? purgeFiles(dir_.Get(), kPurgeFactor * timeout, pause) : std::nullopt;
  if (share) {
    SessionIndex::Purge(dir_.Get(), *share);
  }
}

}  // namespace QELO::Platform
