#pragma once

#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <set>

namespace QELO {

/// Gives up root for good, for an id that most likely no account has, and no process of another run
/// of the tests: limits of processes count them by their user. @return whether it is done
inline bool becomeOrdinary() {
  constexpr uid_t kFirstId = 20'000;
  constexpr uid_t kIds = 40'000;  // a container may have no more than 65,536
  const uid_t id = kFirstId + static_cast<uid_t>(getpid()) % kIds;
  return geteuid() != 0 ||
         (setgroups(0, nullptr) == 0 && setresgid(id, id, id) == 0 && setresuid(id, id, id) == 0);
}

/// Takes a capability below 32 from the process for good.
inline bool dropCapability(unsigned capability) {
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct data[_LINUX_CAPABILITY_U32S_3] = {};
  if (syscall(SYS_capget, &header, data) != 0) {
    return false;
  }
  data[0].effective &= ~(1u << capability);
  data[0].permitted &= ~(1u << capability);
  return syscall(SYS_capset, &header, data) == 0;
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
  std::erase_if(found, [](int fd) { return fcntl(fd, F_GETFD) < 0; });  // the listing's own
  return found;
}

}  // namespace QELO
