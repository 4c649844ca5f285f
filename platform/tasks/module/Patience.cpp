#include "platform/tasks/module/Patience.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>

#include "platform/tasks/ProcessIdentity.h"

namespace QELO::Platform {
namespace {

constexpr char kName[] = "webapi";
constexpr int64_t kNone = INT64_MAX;

std::atomic<int64_t> deadline{kNone};  // bootMilliseconds()

int sleepWithin(sqlite3_vfs*, int microseconds) {
  const int64_t left = Patience::Left();
  const int64_t pause = left == kNone ? microseconds : std::min<int64_t>(microseconds, left * 1000);
  if (pause > 0) {
    usleep(static_cast<useconds_t>(pause));
  }
  return static_cast<int>(pause);
}

/// A lease makes others wait for the file as they open it, unless they will not. Nothing else of a
/// plain file's changes.
int openAtOnce(const char* path, int flags, int mode) {
  return open(path, flags | O_NONBLOCK, mode);
}

bool makeFileSystem() {
  sqlite3_vfs* ordinary = sqlite3_vfs_find(nullptr);
  if (ordinary == nullptr) {
    return false;
  }
  static sqlite3_vfs own = *ordinary;
  own.zName = kName;
  own.pNext = nullptr;
  own.xSleep = sleepWithin;
  if (own.iVersion >= 3 && own.xSetSystemCall != nullptr) {
    own.xSetSystemCall(&own, "open", reinterpret_cast<sqlite3_syscall_ptr>(openAtOnce));
  }
  return sqlite3_vfs_register(&own, 0) == SQLITE_OK;
}

}  // namespace

Patience::Patience(int milliseconds) {
  deadline = bootMilliseconds() + milliseconds;
}

Patience::~Patience() {
  deadline = kNone;
}

int64_t Patience::Left() {
  const int64_t end = deadline;
  return end == kNone ? kNone : std::max<int64_t>(end - bootMilliseconds(), 0);
}

const char* Patience::FileSystem() {
  static const bool made = makeFileSystem();
  return made ? kName : nullptr;
}

bool isHeldByOthers(sqlite3* database) {
  switch (sqlite3_errcode(database) & 0xff) {
    case SQLITE_BUSY:
    case SQLITE_LOCKED:
    case SQLITE_PROTOCOL:  // no reader's place was to be had
      return true;
    case SQLITE_CANTOPEN:
      return sqlite3_system_errno(database) == EWOULDBLOCK;
    default:
      return false;
  }
}

}  // namespace QELO::Platform
