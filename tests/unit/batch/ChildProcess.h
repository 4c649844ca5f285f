#pragma once

#include <grp.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <set>

namespace QELO {

/// An id that no account has.
inline constexpr uid_t kOrdinaryId = 54321;

/// Gives up root for good. @return whether the process is an ordinary user's now
inline bool becomeOrdinary() {
  return geteuid() != 0 ||
         (setgroups(0, nullptr) == 0 && setresgid(kOrdinaryId, kOrdinaryId, kOrdinaryId) == 0 &&
          setresuid(kOrdinaryId, kOrdinaryId, kOrdinaryId) == 0);
}

/// @return the child's status as waitpid(2) gives it
inline int waitForEnd(pid_t child) {
  int status = -1;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  return status;
}

/// Runs a piece of a test, with its expectations, in a process of its own.
/// @return 0 when all held
template <typename Body>
int inChild(Body body) {
  fflush(nullptr);
  const pid_t child = fork();
  if (child == 0) {
    body();
    fflush(nullptr);
    _exit(testing::Test::HasFailure() ? 1 : 0);
  }
  return waitForEnd(child);
}

inline std::set<int> openDescriptors() {
  std::set<int> found;
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    found.insert(atoi(entry.path().filename().c_str()));
  }
  return found;
}

}  // namespace QELO
