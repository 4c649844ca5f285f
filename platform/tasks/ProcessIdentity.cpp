#include "platform/tasks/ProcessIdentity.h"

#include <fcntl.h>
#include <signal.h>
#include <time.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>

#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr char kBootId[] = "/proc/sys/kernel/random/boot_id";

/// The first part of a small file of the kernel's. @return false when it cannot be read
bool readKernelFile(const std::string& path, std::string& text) {
  std::array<char, 4096> buffer{};
  const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  const ssize_t count =
      file ? TEMP_FAILURE_RETRY(read(file.Get(), buffer.data(), buffer.size())) : -1;
  if (count <= 0) {
    return false;
  }
  text.assign(buffer.data(), static_cast<size_t>(count));
  return true;
}

std::string processFile(pid_t pid, const char* name) {
  return "/proc/" + std::to_string(pid) + "/" + name;
}

/// @param state  the letter that tells what the process does
bool readStat(pid_t pid, char& state, uint64_t& start) {
  std::string text;
  if (!readKernelFile(processFile(pid, "stat"), text)) {
    return false;
  }
  // The second field is the process's name in brackets, which may hold anything.
  const size_t name = text.rfind(')');
  unsigned long long ticks = 0;
  if (name == std::string::npos ||
      sscanf(text.c_str() + name + 1,
             " %c %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %*s %llu",
             &state, &ticks) != 2) {
    return false;
  }
  start = ticks;
  return true;
}

bool hasEnded(char state) {
  return state == 'Z' || state == 'X' || state == 'x';
}

}  // namespace

std::string readBootId() {
  std::string text;
  readKernelFile(kBootId, text);
  return text.substr(0, text.find('\n'));
}

int64_t bootMilliseconds() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<int64_t>(now.tv_sec) * 1000 + now.tv_nsec / 1'000'000;
}

bool identifyProcess(pid_t pid, ProcessIdentity& identity) {
  char state = 'X';
  uint64_t start = 0;
  if (pid <= 0 || !readStat(pid, state, start) || hasEnded(state)) {
    return false;
  }
  identity = {pid, start, readBootId()};
  return true;
}

ProcessState findProcess(const ProcessIdentity& identity) {
  char state = 'X';
  uint64_t start = 0;
  if (identity.pid <= 0) {
    return ProcessState::kGone;
  }
  if (readStat(identity.pid, state, start)) {
    return start == identity.start && !hasEnded(state) ? ProcessState::kRunning
                                                       : ProcessState::kGone;
  }
  // The kernel may hide other users' processes; their numbers it does not.
  return kill(identity.pid, 0) != 0 && errno == ESRCH ? ProcessState::kGone
                                                      : ProcessState::kUnknown;
}

bool processBelongsTo(pid_t pid, uid_t user) {
  std::string text;
  std::array<unsigned, 4> ids{};
  if (user == 0) {
    return true;
  }
  if (!readKernelFile(processFile(pid, "status"), text)) {
    return false;
  }
  // The line break is no part of the process's name, which stands before and is printed escaped.
  const size_t line = text.find("\nUid:");
  if (line == std::string::npos ||
      sscanf(text.c_str() + line, "\nUid: %u %u %u %u", &ids[0], &ids[1], &ids[2], &ids[3]) != 4) {
    return false;
  }
  return ids[0] == user || ids[1] == user || ids[2] == user || ids[3] == user;
}

}  // namespace QELO::Platform
