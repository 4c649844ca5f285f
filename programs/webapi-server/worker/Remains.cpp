#include "programs/webapi-server/worker/Remains.h"

#include <fcntl.h>
#include <fenv.h>
#include <linux/capability.h>
#include <locale.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <string_view>

#include "programs/webapi-server/workers/MemoryUse.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

constexpr int kDescriptors = 64;    ///< that a worker may have; it has a handful
constexpr nlink_t kOneThread = 3;   ///< links of the threads' directory: itself, its parent's, ours
constexpr int kInputOfProcess = 1;  ///< ioprio_get(2)'s IOPRIO_WHO_PROCESS

/// As getdents64(2) gives it.
struct DirectoryEntry {
  uint64_t inode;
  int64_t next;
  uint16_t size;
  uint8_t type;
  char name[1];
};

FileIdentity workingDirectory() {
  const UniqueFd directory(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC));
  return FileIdentity(directory.Get());
}

bool isIn(const FileIdentity& wanted) {
  const UniqueFd directory(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC));
  return wanted.IsAt(directory.Get());
}

bool hasOneThread() {
  struct stat info {};
  return stat("/proc/self/task", &info) == 0 && info.st_nlink == kOneThread;
}

/// Descendants whose parents have ended are ours as well.
bool hasNoChild() {
  for (;;) {
    const pid_t pid = waitpid(-1, nullptr, WNOHANG | __WALL);
    if (pid <= 0) {
      return pid < 0 && errno == ECHILD;
    }
  }
}

/// Kernels that do not tell have none of them counted.
bool hasTimers(int expected) {
  char text[2048];
  const UniqueFd file(open("/proc/self/timers", O_RDONLY | O_CLOEXEC));
  const ssize_t count = file ? read(file.Get(), text, sizeof text) : -1;
  if (count < 0) {
    return true;
  }
  int found = 0;
  for (std::string_view rest(text, static_cast<size_t>(count)); !rest.empty();) {
    found += rest.starts_with("ID:") ? 1 : 0;
    const size_t end = rest.find('\n');
    rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
  }
  return found == expected;
}

bool isSame(const rlimit& left, const rlimit& right) {
  return left.rlim_cur == right.rlim_cur && left.rlim_max == right.rlim_max;
}

}  // namespace

const char* Remains::TextOf(Left left) {
  switch (left) {
    case Left::kProcess:
      return "a process";
    case Left::kThread:
      return "a thread";
    case Left::kDescriptor:
      return "a descriptor";
    case Left::kDirectory:
      return "another working directory";
    case Left::kPriority:
      return "another priority";
    case Left::kTimer:
      return "a timer";
    case Left::kRights:
      return "other rights";
    case Left::kLimit:
      return "another limit";
    case Left::kMemory:
      return "too much memory";
    default:
      return nullptr;
  }
}

bool Remains::Ids::operator==(const Ids& other) const {
  return memcmp(user, other.user, sizeof user) == 0 &&
         memcmp(group, other.group, sizeof group) == 0 && groups == other.groups &&
         capabilities == other.capabilities && secureBits == other.secureBits &&
         noNewPrivileges == other.noNewPrivileges;
}

/// By ids alone a process looks the same that has become the root of a user namespace of its own.
bool Remains::Read(Ids& ids) {
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct words[_LINUX_CAPABILITY_U32S_3]{};
  static_assert(sizeof words == sizeof ids.capabilities);
  const bool hasWords = syscall(SYS_capget, &header, words) == 0;
  memcpy(ids.capabilities.data(), words, sizeof words);
  ids.secureBits = prctl(PR_GET_SECUREBITS);
  ids.noNewPrivileges = prctl(PR_GET_NO_NEW_PRIVS, 0, 0, 0, 0);
  const int count = getgroups(0, nullptr);
  ids.groups.resize(count > 0 ? static_cast<size_t>(count) : 0);
  return getresuid(&ids.user[0], &ids.user[1], &ids.user[2]) == 0 &&
         getresgid(&ids.group[0], &ids.group[1], &ids.group[2]) == 0 &&
         getgroups(count, ids.groups.data()) == count && hasWords;
}

bool Remains::Read(Schedule& schedule) {
  schedule.nice = getpriority(PRIO_PROCESS, 0);
  schedule.policy = sched_getscheduler(0);
  schedule.input = syscall(SYS_ioprio_get, kInputOfProcess, 0);
  return sched_getaffinity(0, sizeof schedule.processors, &schedule.processors) == 0;
}

bool Remains::ListDescriptors(uint64_t& open) const {
  const UniqueFd directory(::open("/proc/self/fd", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  alignas(DirectoryEntry) char text[4096];
  open = 0;
  for (long count; (count = syscall(SYS_getdents64, directory.Get(), text, sizeof text)) != 0;) {
    if (count < 0) {
      return false;
    }
    for (long at = 0; at < count;) {
      const auto* entry = reinterpret_cast<const DirectoryEntry*>(text + at);
      at += entry->size;
      int number = 0;
      const char* name = static_cast<const char*>(entry->name);
      if (*name == '.') {
        continue;
      }
      if (std::from_chars(name, name + strlen(name), number).ec != std::errc() ||
          number >= kDescriptors) {
        return false;
      }
      open |= number == directory.Get() ? 0 : uint64_t{1} << static_cast<unsigned>(number);
    }
  }
  return true;
}

bool Remains::HasDescriptors() const {
  uint64_t open = 0;
  if (!ListDescriptors(open) || open != open_) {
    return false;
  }
  size_t next = 0;
  for (int number = 0; number < kDescriptors; ++number) {
    if ((open_ >> static_cast<unsigned>(number) & 1U) != 0 && !files_[next++].IsAt(number)) {
      return false;
    }
  }
  return true;
}

bool Remains::Keep() {
  closelog();
  directory_ = workingDirectory();
  umask_ = umask(0);
  umask(umask_);
  cLocale_ = setlocale(LC_ALL, nullptr);
  streams_ = std::make_unique<StreamFormats>();
  for (size_t number = 1; number < kSignals; ++number) {
    sigaction(static_cast<int>(number), nullptr, &handlers_[number]);
  }
  for (size_t i = 0; i < limits_.size(); ++i) {
    getrlimit(static_cast<__rlimit_resource>(i), &limits_[i]);
  }
  files_.clear();
  if (!ListDescriptors(open_)) {
    return false;
  }
  for (int number = 0; number < kDescriptors; ++number) {
    if ((open_ >> static_cast<unsigned>(number) & 1U) != 0) {
      files_.emplace_back(number);
    }
  }
  return sigprocmask(SIG_SETMASK, nullptr, &blocked_) == 0 && Read(ids_) && Read(schedule_) &&
         hasOneThread() && hasNoChild() && hasTimers(timers_) && HasDescriptors();
}

void Remains::PutBackSignals() {
  const itimerval none{};
  for (const __itimer_which which : {ITIMER_REAL, ITIMER_VIRTUAL, ITIMER_PROF}) {
    setitimer(which, &none, nullptr);
  }
  for (size_t number = 1; number < kSignals; ++number) {
    struct sigaction now {};
    const auto& kept = handlers_[number];
    if (sigaction(static_cast<int>(number), nullptr, &now) == 0 &&
        (now.sa_handler != kept.sa_handler || now.sa_flags != kept.sa_flags)) {
      sigaction(static_cast<int>(number), &kept, nullptr);
    }
  }
  sigprocmask(SIG_SETMASK, &blocked_, nullptr);
  const stack_t own{nullptr, SS_DISABLE, 0};
  sigaltstack(&own, nullptr);
}

void Remains::PutBackRest() {
  umask(umask_);
  uselocale(LC_GLOBAL_LOCALE);
  if (std::locale() != cppLocale_) {
    std::locale::global(cppLocale_);
  }
  if (cLocale_ != setlocale(LC_ALL, nullptr)) {
    setlocale(LC_ALL, cLocale_.c_str());
  }
  streams_->PutBack();
  setlogmask(LOG_UPTO(LOG_DEBUG));
  fesetenv(FE_DFL_ENV);
  prctl(PR_SET_PDEATHSIG, 0);
  prctl(PR_SET_DUMPABLE, 0);
  prctl(PR_SET_CHILD_SUBREAPER, 1);
}

bool Remains::HasSchedule() {
  Schedule now;
  if (Read(now) && now.nice != schedule_.nice) {
    setpriority(PRIO_PROCESS, 0, schedule_.nice);
    now.nice = getpriority(PRIO_PROCESS, 0);
  }
  return now.nice == schedule_.nice && now.policy == schedule_.policy &&
         now.input == schedule_.input && CPU_EQUAL(&now.processors, &schedule_.processors) != 0;
}

Remains::Left Remains::PutBack() {
  closelog();
  // Signals that are pending come now, and may end the process: the answer is out.
  PutBackSignals();
  PutBackRest();
  Ids ids;
  if (!hasNoChild()) {
    return Left::kProcess;
  }
  if (!hasOneThread()) {
    return Left::kThread;
  }
  if (!HasDescriptors()) {
    return Left::kDescriptor;
  }
  if (!isIn(directory_)) {
    return Left::kDirectory;
  }
  if (!HasSchedule()) {
    return Left::kPriority;
  }
  if (!hasTimers(timers_)) {
    return Left::kTimer;
  }
  if (!Read(ids) || !(ids == ids_)) {
    return Left::kRights;
  }
  for (size_t i = 0; i < limits_.size(); ++i) {
    rlimit now{};
    if (getrlimit(static_cast<__rlimit_resource>(i), &now) != 0 || !isSame(now, limits_[i])) {
      return Left::kLimit;
    }
  }
  return OwnMemory() > mostMemory_ ? Left::kMemory : Left::kNothing;
}

}  // namespace QELO
