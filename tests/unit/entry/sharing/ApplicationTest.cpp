// CheckSharingAppPermission: the application's own check, with the rights of its file.

#include <grp.h>
#include <sys/wait.h>

#include "tests/unit/entry/sharing/Fixture.h"

namespace QELO {
namespace {

constexpr int kUser = 4242;

class LinkApplication : public Links {
 protected:
  void SetUp() override {
    Links::SetUp();
    Install("link_checks");
    Describe("{}", kByLink);
  }
  static bool BecomeUser(const std::string&, bool) {
    const uid_t same = static_cast<uid_t>(-1);
    return setgroups(0, nullptr) == 0 && setresgid(same, kUser, same) == 0 &&
           setresuid(same, kUser, same) == 0;
  }
  /// Runs a body in a child process with root's rights and two supplementary groups.
  template <typename Body>
  static void InChild(Body body) {
    if (geteuid() != 0) {
      GTEST_SKIP() << "needs root";
    }
    const pid_t child = fork();
    if (child == 0) {
      const gid_t groups[] = {7, 8};
      _exit(setgroups(2, groups) == 0 && body() ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
  static bool IsRootAgain() {
    uid_t ids[6];
    getresuid(&ids[0], &ids[1], &ids[2]);
    getresgid(&ids[3], &ids[4], &ids[5]);
    gid_t groups[2] = {};
    return std::all_of(ids, ids + 6, [](uid_t id) { return id == 0; }) &&
           getgroups(0, nullptr) == 2 && getgroups(2, groups) == 2 && groups[0] == 7;
  }
};

TEST_F(LinkApplication, AnswerOfTheCheckIsTheResult) {
  EXPECT_TRUE(AskApplication("allow"));
  EXPECT_FALSE(AskApplication("refuse"));
}

TEST_F(LinkApplication, CheckSeesRequestAndResponse) {
  EXPECT_FALSE(AskApplication("answer"));
  EXPECT_EQ(entry->Response()->GetError(), 499);
  EXPECT_TRUE(entry->Request()->HasAttr("asked"));
}

TEST_F(LinkApplication, CallThatNoEntryFitsIsRefused) {
  MakeRequest("link", "visitor", "{}", "fail");
  EXPECT_FALSE(entry->CheckSharingAppPermission(entry->Request(), entry->Response()));
  EXPECT_EQ(Calls("InitCredentialsByExecutable"), 0);
}

TEST_F(LinkApplication, EntryWithoutACheckIsRefused) {
  MakeRequest("link", "visitor", "{}", "silent");
  EXPECT_FALSE(entry->CheckSharingAppPermission(entry->Request(), entry->Response()));
}

TEST_F(LinkApplication, CredentialsAreThoseOfTheLibrarysFile) {
  AskApplication("allow");
  EXPECT_EQ(platform->calls.back(), "InitCredentialsByExecutable(" + LibraryPath() + ", keep)");
}

TEST_F(LinkApplication, WithoutItsCredentialsIsNotAsked) {
  platform->executableCredentials = [](const std::string&, bool) {
    errno = ENOENT;
    return false;
  };
  EXPECT_FALSE(AskApplication("allow"));
  EXPECT_FALSE(entry->Request()->HasAttr("asked"));
  EXPECT_EQ(Logged(LOG_ERR, "cannot take the credentials of " + LibraryPath() +
                                ". [No such file or directory]"),
            1);
}

TEST_F(LinkApplication, RunsWithTheFilesIdsWhichAreGivenBack) {
  platform->executableCredentials = BecomeUser;
  for (const char* check : {"allow", "refuse", "throw"}) {
    InChild([&] {
      AskApplication(check);
      return entry->Request()->GetAttr("euid") == Json::Value(kUser) &&
             entry->Request()->GetAttr("egid") == Json::Value(kUser) && IsRootAgain();
    });
  }
}

TEST_F(LinkApplication, RootsReturnIsNoted) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  AskApplication("allow");
  EXPECT_EQ(Logged(38, "WARNING: setresgid(0, 0, 0)"), 1);
  EXPECT_EQ(Logged(38, "WARNING: setresuid(0, 0, 0)"), 1);
}

TEST_F(LinkApplication, IdsThatCannotBeGivenBackAreLoggedAndRefuseTheCall) {
  platform->executableCredentials = [](const std::string&, bool) {
    return setgroups(0, nullptr) == 0 && setresgid(kUser, kUser, kUser) == 0 &&
           setresuid(kUser, kUser, kUser) == 0;
  };
  InChild([&] {
    const bool allowed = AskApplication("allow");
    return !allowed &&
           Logged(LOG_ERR, "ERROR: setresgid(0, 0, 0) [Operation not permitted]") == 1 &&
           Logged(LOG_ERR, "ERROR: setresuid(0, 0, 0) [Operation not permitted]") == 1 &&
           Logged(LOG_ERR, "ERROR: setgroups(2) [Operation not permitted]") == 1 &&
           !AskApplication("allow") && entry->Request()->GetAttr("asked") == Json::Value(1);
  });
}

TEST_F(LinkApplication, ExceptionEndsHereAndRefuses) {
  EXPECT_FALSE(AskApplication("throw"));
  EXPECT_EQ(Logged(LOG_ERR, "sharing check function threw an exception: no check today"), 1);
}

TEST_F(LinkApplication, PrintsNothing) {
  bool allowed = false;
  const CgiAnswer printed = Printed([&] { allowed = AskApplication("print"); });
  EXPECT_TRUE(allowed);
  EXPECT_EQ(printed.text, "");
}

TEST_F(LinkApplication, WorkingDirectoryIsGivenBack) {
  EXPECT_TRUE(AskApplication("wander"));
  EXPECT_EQ(std::filesystem::current_path(), std::filesystem::canonical(directory));
}

TEST_F(LinkApplication, NullArgumentsAreRefused) {
  MakeRequest();
  EXPECT_FALSE(entry->CheckSharingAppPermission(nullptr, entry->Response()));
  EXPECT_FALSE(entry->CheckSharingAppPermission(entry->Request(), nullptr));
}

}  // namespace
}  // namespace QELO
