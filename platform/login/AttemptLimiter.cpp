#include "platform/login/AttemptLimiter.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <time.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "platform/base/FileLock.h"
#include "platform/base/IpAddress.h"
#include "platform/base/Paths.h"
#include "platform/base/PrivateDir.h"
#include "webapi/base/Hex.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Session.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "LoginLimiter.cpp";
constexpr char kLockName[] = ".lock";
constexpr long kPurgePause = 60;  // seconds
constexpr int kMost = 1'000'000;  // attempts, and seconds of a window

std::string addressFile(const std::string& address) {
  IpAddress parsed;
  return IpAddress::Parse(address, parsed) ? parsed.NetworkHex() : "none";
}

/// @return an empty name for an account that is not counted by itself
std::string accountFile(const std::string& address, const std::string& account) {
  return account.empty() || account.size() > LoginLimiter::kLongestAccount
             ? std::string()
             : addressFile(address) + "-" + HexText(account);
}

}  // namespace

LoginLimiter::LoginLimiter() : dir_(openPrivateDir(Paths::kLoginDir, true)) {
  const Settings settings;
  window_ = settings.GetNumber("login_window", 300, 1, kMost);
  perAccount_ = settings.GetNumber("login_attempts", 5, 1, kMost);
  perAddress_ = settings.GetNumber("login_attempts_per_address", 20, 1, kMost);
}

UniqueFd LoginLimiter::Lock() {
  UniqueFd lock(
      openat(dir_.Get(), kLockName, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (!lock || !lockFile(lock.Get(), kLockWait)) {
    return UniqueFd();
  }
  now_ = time(nullptr);
  return lock;
}

/// A missing file, one that is cut short and a window that is over count as no attempts.
bool LoginLimiter::Read(const std::string& file, Count& count) const {
  const UniqueFd opened(openat(dir_.Get(), file.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
  count = {now_, 0};
  if (!opened) {
    return errno == ENOENT;
  }
  Count stored;
  const ssize_t size = TEMP_FAILURE_RETRY(read(opened.Get(), &stored, sizeof stored));
  if (size == sizeof stored && stored.attempts > 0 && now_ - stored.start < window_) {
    // A start ahead of now says that the clock was set back.
    count = {std::min(stored.start, now_), stored.attempts};
  }
  return size >= 0;
}

bool LoginLimiter::Write(const std::string& file, const Count& count) const {
  const UniqueFd opened(openat(dir_.Get(), file.c_str(),
                               O_WRONLY | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
  return opened && TEMP_FAILURE_RETRY(write(opened.Get(), &count, sizeof count)) == sizeof count;
}

int LoginLimiter::Wait(const Count& count, int limit) const {
  return count.attempts < limit ? 0 : static_cast<int>(count.start + window_ - now_);
}

int LoginLimiter::Attempt(const std::string& address, const std::string& account) {
  const std::string ofAddress = addressFile(address);
  const std::string ofAccount = accountFile(address, account);
  const UniqueFd lock = Lock();
  Count addressCount;
  Count accountCount;
  if (!lock || !Read(ofAddress, addressCount) ||
      (!ofAccount.empty() && !Read(ofAccount, accountCount))) {
    WEBAPI_LOG(kSource, "cannot count a login attempt in %s [%s]", Paths::kLoginDir,
               strerror(errno));
    return -1;
  }
  purgeFiles(dir_.Get(), window_, kPurgePause);
  const int wait = std::max(Wait(addressCount, perAddress_), Wait(accountCount, perAccount_));
  if (wait > 0) {
    return wait;
  }
  ++addressCount.attempts;
  ++accountCount.attempts;
  if (!Write(ofAddress, addressCount) || (!ofAccount.empty() && !Write(ofAccount, accountCount))) {
    WEBAPI_LOG(kSource, "cannot keep the count of login attempts in %s [%s]", Paths::kLoginDir,
               strerror(errno));
    return -1;
  }
  return 0;
}

void LoginLimiter::Succeeded(const std::string& address, const std::string& account) {
  const std::string ofAddress = addressFile(address);
  const std::string ofAccount = accountFile(address, account);
  const UniqueFd lock = Lock();
  if (!lock) {
    return;
  }
  if (!ofAccount.empty()) {
    unlinkat(dir_.Get(), ofAccount.c_str(), 0);
  }
  Count count;
  if (Read(ofAddress, count) && count.attempts > 0) {
    --count.attempts;
    Write(ofAddress, count);
  }
}

}  // namespace QELO::Platform

extern "C" {

int QeloLoginAttempt(const char* address, const char* account) {
  return QELO::Platform::LoginLimiter().Attempt(address, account);
}

void QeloLoginSucceeded(const char* address, const char* account) {
  QELO::Platform::LoginLimiter().Succeeded(address, account);
}

}  // extern "C"
