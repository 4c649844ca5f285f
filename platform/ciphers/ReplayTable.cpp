#include "platform/ciphers/ReplayTable.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "platform/base/Paths.h"
#include "platform/base/PrivateDir.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr char kFile[] = "seen";
constexpr int kLockTries = 100;
constexpr timespec kLockPause{0, 10'000'000};  // 10 ms

struct Record {
  int64_t until;
  char mark[ReplayTable::kMarkSize];
};
static_assert(sizeof(Record) == 32);
using Bucket = Record[ReplayTable::kBucketSize];

bool lock(int file) {
  for (int i = 0; i < kLockTries; ++i) {
    if (flock(file, LOCK_EX | LOCK_NB) == 0) {
      return true;
    }
    if (errno != EWOULDBLOCK && errno != EINTR) {
      return false;
    }
    nanosleep(&kLockPause, nullptr);
  }
  return false;
}

UniqueFd openTable() {
  const UniqueFd dir = openPrivateDir(Paths::kCipherDir, true);
  return dir ? UniqueFd(openat(dir.Get(), kFile, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC,
                               S_IRUSR | S_IWUSR))
             : UniqueFd();
}

off_t placeOf(std::string_view mark) {
  uint16_t number = 0;
  memcpy(&number, mark.data(), sizeof number);
  return static_cast<off_t>(number % ReplayTable::kBuckets * sizeof(Bucket));
}

}  // namespace

bool ReplayTable::Enter(std::string_view mark, int64_t now, int64_t until) {
  const UniqueFd file = openTable();
  if (mark.size() < kMarkSize || !file || !lock(file.Get())) {
    return false;
  }
  Bucket bucket = {};  // what is behind the file's end reads as nothing
  const off_t place = placeOf(mark);
  if (pread(file.Get(), bucket, sizeof bucket, place) < 0) {
    return false;
  }
  Record* free = nullptr;
  for (Record& record : bucket) {
    if (record.until <= now) {
      free = &record;
    } else if (memcmp(record.mark, mark.data(), kMarkSize) == 0) {
      return false;
    }
  }
  if (free == nullptr) {
    return false;
  }
  free->until = until;
  memcpy(free->mark, mark.data(), kMarkSize);
  const off_t offset = place + (free - bucket) * static_cast<off_t>(sizeof(Record));
  return pwrite(file.Get(), free, sizeof *free, offset) == static_cast<ssize_t>(sizeof *free);
}

}  // namespace QELO::Platform
