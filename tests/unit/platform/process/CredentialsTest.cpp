#include <grp.h>
#include <linux/capability.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <set>
#include <vector>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Credential.h"

namespace {

struct Ids {
  uid_t real, effective, saved;
  gid_t groupReal, groupEffective, groupSaved;
  std::set<gid_t> groups;

  static Ids Now() {
    Ids ids{};
    EXPECT_EQ(getresuid(&ids.real, &ids.effective, &ids.saved), 0);
    EXPECT_EQ(getresgid(&ids.groupReal, &ids.groupEffective, &ids.groupSaved), 0);
    std::vector<gid_t> groups(static_cast<size_t>(getgroups(0, nullptr)));
    EXPECT_GE(getgroups(static_cast<int>(groups.size()), groups.data()), 0);
    ids.groups = {groups.begin(), groups.end()};
    return ids;
  }
  bool operator==(const Ids&) const = default;
};

bool dropCapability(int capability) {
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct data[2] = {};
  if (syscall(SYS_capget, &header, data) != 0) {
    return false;
  }
  data[0].effective &= ~(1U << capability);
  data[0].permitted &= ~(1U << capability);
  return syscall(SYS_capset, &header, data) == 0;
}

class Credentials : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    if (!IsRoot()) {
      GTEST_SKIP() << "only root becomes other users";
    }
  }
};

TEST_F(Credentials, KeepingPrivilegeSwitchesTheEffectiveIdsAlone) {
  EXPECT_EQ(InChild([] {
              if (!ResetCredentialsByName("alice", true)) {
                return 1;
              }
              const Ids ids = Ids::Now();
              return ids == Ids{0, 1002, 0, 0, 1002, 0, {1002, 1101}} ? 0 : 2;
            }),
            0);
}

TEST_F(Credentials, KeepingPrivilegeLeavesTheWayBack) {
  EXPECT_EQ(InChild([] {
              return ResetCredentialsByName("alice", true) && seteuid(0) == 0 && setegid(0) == 0 &&
                             ResetCredentialsByName("bob", true) && geteuid() == 1003
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(Credentials, WithoutPrivilegeAllIdsSwitchForGood) {
  EXPECT_EQ(InChild([] {
              if (!ResetCredentialsByName("admin", false)) {
                return 1;
              }
              if (!(Ids::Now() == Ids{1001, 1001, 1001, 1001, 1001, 1001, {1001, 1100}})) {
                return 2;
              }
              return seteuid(0) != 0 && setegid(0) != 0 && setuid(0) != 0 ? 0 : 3;
            }),
            0);
}

TEST_F(Credentials, GroupsOfTheCallerDoNotStay) {
  EXPECT_EQ(InChild([] {
              const gid_t extra[] = {0, 4242};
              return setgroups(2, extra) == 0 && ResetCredentialsByName("system", false) &&
                             Ids::Now().groups == std::set<gid_t>{900}
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(Credentials, RootToRootWorks) {
  EXPECT_EQ(InChild([] {
              return ResetCredentialsByName("root", false) && Ids::Now().effective == 0 ? 0 : 1;
            }),
            0);
}

TEST_F(Credentials, UnknownUserChangesNothing) {
  EXPECT_EQ(InChild([] {
              const Ids before = Ids::Now();
              SyslogCapture::Clear();
              return !ResetCredentialsByName("zoe", false) && errno == ENOENT &&
                             SyslogCapture::Count("there is no account zoe") == 1 &&
                             Ids::Now() == before
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(Credentials, WithoutRootsRightsTheLogSaysSo) {
  EXPECT_EQ(InChild([] {
              if (!ResetCredentialsByName("alice", false)) {
                return 1;
              }
              SyslogCapture::Clear();
              return !ResetCredentialsByName("bob", false) && errno == EPERM &&
                             SyslogCapture::Count("cannot become bob without root's rights") == 1
                         ? 0
                         : 2;
            }),
            0);
}

TEST_F(Credentials, UnreadableGroupFileChangesNothing) {
  ASSERT_EQ(remove(Path("etc/group").c_str()), 0);
  EXPECT_EQ(InChild([] {
              const Ids before = Ids::Now();
              return !ResetCredentialsByName("alice", false) && Ids::Now() == before ? 0 : 1;
            }),
            0);
}

TEST_F(Credentials, AccountWithAnIdThatMeansNoChangeIsRefused) {
  Write("etc/passwd", "odd:x:4294967295:1002::/:/bin/sh\nstrange:x:1002:4294967295::/:/bin/sh\n");
  EXPECT_EQ(InChild([] {
              return !ResetCredentialsByName("odd", false) &&
                             !ResetCredentialsByName("strange", false)
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(Credentials, FailureHalfWayPutsTheGroupsBack) {
  EXPECT_EQ(InChild([] {
              const gid_t extra[] = {0, 4242};
              if (setgroups(2, extra) != 0 || !dropCapability(CAP_SETUID)) {
                return 1;
              }
              const Ids before = Ids::Now();
              for (const bool keep : {true, false}) {
                SyslogCapture::Clear();
                if (ResetCredentialsByName("alice", keep) || !(Ids::Now() == before)) {
                  return 2;
                }
                if (SyslogCapture::Count("cannot become alice [Operation not permitted]") != 1) {
                  return 3;
                }
              }
              return 0;
            }),
            0);
}

TEST_F(Credentials, GroupIdsThatCannotBePutBackAreLogged) {
  EXPECT_EQ(InChild([] {
              // Without the right to set groups, setgroups fails and so does the way back.
              if (!dropCapability(CAP_SETGID) || ResetCredentialsByName("alice", true)) {
                return 1;
              }
              return SyslogCapture::Count("cannot restore the group ids [") == 1 ? 0 : 2;
            }),
            0);
}

TEST_F(Credentials, WithoutRootOnlyTheOwnAccountIsTaken) {
  EXPECT_EQ(InChild([] {
              if (!ResetCredentialsByName("alice", false)) {
                return 1;
              }
              return ResetCredentialsByName("alice", true) &&
                             ResetCredentialsByName("alice", false) &&
                             !ResetCredentialsByName("bob", true) &&
                             !ResetCredentialsByName("root", false)
                         ? 0
                         : 2;
            }),
            0);
}

TEST_F(Credentials, OwnAccountWithoutPrivilegeLosesTheWayBack) {
  EXPECT_EQ(InChild([] {
              return ResetCredentialsByName("alice", true) &&
                             ResetCredentialsByName("alice", false) && seteuid(0) != 0
                         ? 0
                         : 1;
            }),
            0);
}

/// A library in a directory of its own, and whose it is.
class CredentialsByFile : public Credentials {
 protected:
  void SetUp() override {
    Credentials::SetUp();
    if (!IsSkipped()) {
      ASSERT_EQ(mkdir(Path("libraries").c_str(), 0755), 0);
      ASSERT_EQ(chmod(Path("libraries").c_str(), 0755), 0);
      Write("libraries/check.so", "code", 0644);
    }
  }

  static void Give(uid_t uid) { ASSERT_EQ(chown(library_.c_str(), uid, 0), 0); }
  /// In a child: 0 when it became what `ids` says and can come back, 1 when refused, else 2.
  static int Become(uid_t uid, gid_t gid) {
    return InChild([&] {
      const Ids before = Ids::Now();
      if (!InitCredentialsByExecutable(library_.c_str(), true)) {
        return Ids::Now() == before ? 1 : 2;
      }
      return geteuid() == uid && getegid() == gid && seteuid(0) == 0 ? 0 : 2;
    });
  }
  static inline const std::string library_ = Path("libraries/check.so");
};

TEST_F(CredentialsByFile, AreThoseOfItsOwner) {
  EXPECT_EQ(Become(0, 0), 0);
  Give(1002);
  EXPECT_EQ(Become(1002, 1002), 0);
}

TEST_F(CredentialsByFile, WithoutPrivilegeThereIsNoWayBack) {
  Give(1003);
  EXPECT_EQ(InChild([] {
              return InitCredentialsByExecutable(library_.c_str(), false) && getuid() == 1003 &&
                             seteuid(0) != 0
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(CredentialsByFile, OwnerHasToBeAnAccount) {
  Give(54321);
  EXPECT_EQ(Become(0, 0), 1);
  EXPECT_EQ(InChild([] {
              SyslogCapture::Clear();
              InitCredentialsByExecutable(library_.c_str(), true);
              return SyslogCapture::Count("is no account: user id 54321") == 1 ? 0 : 1;
            }),
            0);
}

TEST_F(CredentialsByFile, WhatOthersMayChangeGivesNone) {
  Give(1002);
  for (const mode_t mode : {0664, 0646}) {
    ASSERT_EQ(chmod(library_.c_str(), mode), 0);
    EXPECT_EQ(Become(1002, 1002), 1);
  }
  ASSERT_EQ(chmod(library_.c_str(), 0644), 0);
  for (const mode_t mode : {0775, 0757, 01777}) {
    ASSERT_EQ(chmod(Path("libraries").c_str(), mode), 0);
    EXPECT_EQ(Become(1002, 1002), 1);
  }
  ASSERT_EQ(chmod(Path("libraries").c_str(), 0755), 0);
  ASSERT_EQ(chown(Path("libraries").c_str(), 1003, 0), 0);
  EXPECT_EQ(Become(1002, 1002), 1);
  EXPECT_EQ(InChild([] {
              SyslogCapture::Clear();
              InitCredentialsByExecutable(library_.c_str(), true);
              return SyslogCapture::Count("others may write ") == 1 ? 0 : 1;
            }),
            0);
}

TEST_F(CredentialsByFile, MissingFileAndDirectoryGiveNone) {
  EXPECT_EQ(InChild([] {
              SyslogCapture::Clear();
              return !InitCredentialsByExecutable(Path("nothing.so").c_str(), true) &&
                             !InitCredentialsByExecutable(Path("etc").c_str(), true) &&
                             SyslogCapture::Count("there is no file ") == 2
                         ? 0
                         : 1;
            }),
            0);
}

using OwnCredentials = PrivateRoot;

TEST_F(OwnCredentials, OrdinaryUserBecomesEveryAccountOfItsRoot) {
  if (IsRoot()) {
    GTEST_SKIP() << "for a root that an ordinary user made";
  }
  const Ids before = Ids::Now();
  EXPECT_TRUE(ResetCredentialsByName("alice", true));
  EXPECT_TRUE(ResetCredentialsByName("system", false));
  EXPECT_FALSE(ResetCredentialsByName("zoe", true));
  EXPECT_EQ(Ids::Now(), before);
}

}  // namespace
