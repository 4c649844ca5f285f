// Rights that a call has taken are seen after it.

#include "programs/webapi-server/worker/Remains.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>

namespace QELO {
namespace {

constexpr uid_t kUser = 65534;
constexpr int kFailed = 99;

bool setCapabilities(uint32_t effective, uint32_t permitted) {
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct words[_LINUX_CAPABILITY_U32S_3]{};
  words[0].effective = effective;
  words[0].permitted = permitted;
  return syscall(SYS_capset, &header, words) == 0;
}

/// In a process that is a user's: what is left after `change`.
Remains::Left leftAfter(const std::function<bool()>& prepare, const std::function<bool()>& change) {
  const pid_t child = fork();
  if (child == 0) {
    closefrom(STDERR_FILENO + 1);  // what a runner of tests has open is no worker's
    Remains remains(size_t{1} << 30, 0);
    if (!prepare() || !remains.Keep() || remains.PutBack() != Remains::Left::kNothing ||
        !change()) {
      _exit(kFailed);
    }
    _exit(static_cast<int>(remains.PutBack()));
  }
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) != kFailed) << status;
  return static_cast<Remains::Left>(WEXITSTATUS(status));
}

/// Gives up root but for a way back to some capabilities.
bool becomeUserWith(uint32_t permitted) {
  return setgroups(0, nullptr) == 0 && setresgid(kUser, kUser, kUser) == 0 &&
         prctl(PR_SET_KEEPCAPS, 1) == 0 && setresuid(kUser, kUser, kUser) == 0 &&
         setCapabilities(0, permitted);
}

class WorkerRights : public ::testing::Test {
 protected:
  void SetUp() override {
    if (geteuid() != 0) {
      GTEST_SKIP() << "an ordinary user has no rights to take";
    }
  }
};

TEST_F(WorkerRights, NothingLeft_IsNothing) {
  EXPECT_EQ(leftAfter([] { return becomeUserWith(0); }, [] { return true; }),
            Remains::Left::kNothing);
}

TEST_F(WorkerRights, CapabilityTakenAgain_IsSeen) {
  constexpr uint32_t kChown = 1U << CAP_CHOWN;
  EXPECT_EQ(leftAfter([] { return becomeUserWith(kChown); },
                      [] { return setCapabilities(kChown, kChown); }),
            Remains::Left::kRights);
}

TEST_F(WorkerRights, RootTakenAgain_IsSeen) {
  const auto prepare = [] { return setresuid(kUser, kUser, 0) == 0; };
  EXPECT_EQ(leftAfter(prepare, [] { return seteuid(0) == 0; }), Remains::Left::kRights);
  EXPECT_EQ(leftAfter(prepare, [] { return setresuid(static_cast<uid_t>(-1), 0, kUser) == 0; }),
            Remains::Left::kRights);
}

TEST_F(WorkerRights, PrivilegesThatProgramsMayNotGainAnyMore_AreSeen) {
  EXPECT_EQ(leftAfter([] { return becomeUserWith(0); },
                      [] { return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0; }),
            Remains::Left::kRights);
}

}  // namespace
}  // namespace QELO
