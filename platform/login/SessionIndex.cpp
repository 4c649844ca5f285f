#include "platform/login/SessionIndex.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <utility>
#include <vector>

#include "webapi/base/Hex.h"

namespace QELO::Platform {
namespace {

constexpr char kUsersDir[] = ".users";
constexpr size_t kLongestName = 64;  // bytes of an account's name; longer ones share a directory

UniqueFd openDir(int parent, const char* name) {
  return UniqueFd(openat(parent, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

bool makeDir(int parent, const char* name) {
  return mkdirat(parent, name, S_IRWXU) == 0 || errno == EEXIST;
}

/// Calls `visit(name)` for each entry of a directory whose name starts with no dot.
template <typename Visit>
void forEachEntry(int dir, Visit visit) {
  UniqueFd readable = openDir(dir, ".");
  DIR* stream = readable ? fdopendir(readable.Get()) : nullptr;
  if (stream == nullptr) {
    return;
  }
  readable.Release();  // closedir closes it
  while (const dirent* entry = readdir(stream)) {
    if (entry->d_name[0] != '.') {
      visit(entry->d_name);
    }
  }
  closedir(stream);
}

/// Whether the store has the session; the file of one that is gone is freed.
bool isLive(int store, int dir, const char* id, struct stat& info) {
  if (fstatat(store, id, &info, AT_SYMLINK_NOFOLLOW) == 0) {
    return true;
  }
  unlinkat(dir, id, 0);
  return false;
}

bool isEarlier(const timespec& left, const timespec& right) {
  return std::pair(left.tv_sec, left.tv_nsec) < std::pair(right.tv_sec, right.tv_nsec);
}

}  // namespace

SessionIndex::SessionIndex(int store, const std::string& user, uid_t uid)
    : store_(store),
      name_(std::string(kUsersDir) + "/" + std::to_string(uid) + "-" +
            HexText(user.substr(0, kLongestName))),
      dir_(openDir(store, name_.c_str())) {}

bool SessionIndex::Add(const std::string& id) {
  if (!dir_ && errno == ENOENT && makeDir(store_, kUsersDir) && makeDir(store_, name_.c_str())) {
    dir_ = openDir(store_, name_.c_str());
  }
  return dir_ && linkat(store_, id.c_str(), dir_.Get(), id.c_str(), 0) == 0;
}

void SessionIndex::Remove(const std::string& id) const {
  if (dir_) {
    unlinkat(dir_.Get(), id.c_str(), 0);
  }
}

void SessionIndex::Cap(size_t limit, const std::string& kept) const {
  using Use = std::pair<timespec, std::string>;
  std::vector<Use> others;
  forEachEntry(dir_.Get(), [&](const char* id) {
    struct stat info {};
    if (id != kept && isLive(store_, dir_.Get(), id, info)) {
      others.emplace_back(info.st_mtim, id);
    }
  });
  if (others.size() < limit) {
    return;
  }
  std::sort(others.begin(), others.end(),
            [](const Use& left, const Use& right) { return isEarlier(left.first, right.first); });
  others.resize(others.size() + 1 - limit);
  for (const auto& [lastUse, id] : others) {
    unlinkat(store_, id.c_str(), 0);
    Remove(id);
  }
}

void SessionIndex::Purge(int store, const PurgeShare& share) {
  const UniqueFd users = openDir(store, kUsersDir);
  if (!users) {
    return;
  }
  forEachEntry(users.Get(), [&users, store, &share](const char* user) {
    const UniqueFd dir = share.Has(user) ? openDir(users.Get(), user) : UniqueFd();
    if (dir) {
      forEachEntry(dir.Get(), [&dir, store](const char* id) {
        struct stat info {};
        isLive(store, dir.Get(), id, info);
      });
    }
  });
}

}  // namespace QELO::Platform
