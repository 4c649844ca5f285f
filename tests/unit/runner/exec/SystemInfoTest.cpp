#include <grp.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <functional>

#include "tests/support/FakePlatform.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/batch/ChildProcess.h"
#include "webapi/APIUtils.h"

namespace QELO {
namespace {

constexpr uid_t kUser = 4242;
constexpr gid_t kGroup = 4343;

class QeloInfo : public testing::Test {
 protected:
  void SetUp() override {
    platform = &FakePlatform::Reset();
    SyslogCapture::Clear();
  }

  /// Runs the body in a child with these effective ids, with root within reach or not.
  static void RunAs(uid_t user, gid_t group, bool rootInReach, const std::function<bool()>& body) {
    if (geteuid() != 0) {
      GTEST_SKIP() << "needs root";
    }
    const pid_t child = fork();
    if (child == 0) {
      const uid_t otherUser = rootInReach ? 0 : user;
      const gid_t otherGroup = rootInReach ? 0 : group;
      const bool switched = setgroups(0, nullptr) == 0 &&
                            setresgid(otherGroup, group, otherGroup) == 0 &&
                            setresuid(otherUser, user, otherUser) == 0;
      _exit(switched && body() ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }

  static bool Set() { return APIUtils::SetQeloInfo("key", "value"); }

  FakePlatform* platform = nullptr;
};

TEST_F(QeloInfo, WritesTheKey) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  EXPECT_TRUE(Set());
  ASSERT_EQ(platform->calls.size(), 1u);
  EXPECT_EQ(platform->calls[0], "QLIBCINFOSetKeyValue(key, value)");
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(QeloInfo, FailureToWriteIsFalse) {
  platform->setKeyValue = [](const std::string&, const std::string&) { return -1; };
  EXPECT_FALSE(Set());
  platform->setKeyValue = [](const std::string&, const std::string&) { return 1; };
  EXPECT_EQ(Set(), geteuid() == 0);
}

TEST_F(QeloInfo, TakesRootForTheWritingAlone) {
  RunAs(kUser, kGroup, true, [this] {
    bool wasRoot = false;
    platform->setKeyValue = [&](const std::string&, const std::string&) {
      wasRoot = geteuid() == 0 && getegid() == 0;
      return 0;
    };
    return Set() && wasRoot && geteuid() == kUser && getegid() == kGroup &&
           SyslogCapture::Messages().empty();
  });
}

TEST_F(QeloInfo, GivesBackAlsoWhenTheWritingFails) {
  RunAs(kUser, 0, true, [this] {
    platform->setKeyValue = [](const std::string&, const std::string&) { return -1; };
    return !Set() && geteuid() == kUser && getegid() == 0;
  });
  RunAs(0, kGroup, true, [this] {
    platform->setKeyValue = [](const std::string&, const std::string&) { return -1; };
    return !Set() && geteuid() == 0 && getegid() == kGroup;
  });
}

TEST_F(QeloInfo, WithoutRootNothingIsWrittenAndItIsLogged) {
  RunAs(kUser, kGroup, false, [this] {
    return !Set() && platform->calls.empty() && geteuid() == kUser && getegid() == kGroup &&
           SyslogCapture::Messages().size() == 1 &&
           SyslogCapture::Messages()[0].priority == (LOG_AUTH | LOG_ERR) &&
           SyslogCapture::Count("APIUtils.cpp:") == 1 &&
           SyslogCapture::Count(" ERROR: IF_RUN_AS(0, 0)") == 1;
  });
}

TEST_F(QeloInfo, FailureToGiveBackIsLoggedAsCritical) {
  RunAs(kUser, kGroup, true, [this] {
    platform->setKeyValue = [](const std::string&, const std::string&) {
      // Another identity for good: the former cannot be had back.
      return setresgid(5, 5, 5) == 0 && setresuid(5, 5, 5) == 0 ? 0 : -1;
    };
    return Set() && SyslogCapture::Messages().size() == 1 &&
           SyslogCapture::Messages()[0].priority == (LOG_AUTH | LOG_CRIT) &&
           SyslogCapture::Count("APIUtils.cpp:") == 1 &&
           SyslogCapture::Count(" ERROR: ~IF_RUN_AS(4242, 4343)") == 1;
  });
}

TEST_F(QeloInfo, GivesTheUserBackAlsoWhenTheGroupIsNotToBeHad) {
  RunAs(kUser, kGroup, true, [this] {
    platform->setKeyValue = [](const std::string&, const std::string&) {
      // Root stays within reach, the group does not.
      return setresgid(0, 0, 0) == 0 && dropCapability(CAP_SETGID) ? 0 : -1;
    };
    return Set() && geteuid() == kUser && getegid() == 0 && SyslogCapture::Messages().size() == 1 &&
           SyslogCapture::Messages()[0].priority == (LOG_AUTH | LOG_CRIT) &&
           SyslogCapture::Count("APIUtils.cpp:") == 1 &&
           SyslogCapture::Count(" ERROR: ~IF_RUN_AS(4242, 4343)") == 1;
  });
}

}  // namespace
}  // namespace QELO
