// Whose rights a method runs with when several attributes speak of them, and the process's ids
// after a switch that really happened.

#include <fcntl.h>
#include <grp.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <syslog.h>

#include <array>
#include <cerrno>
#include <functional>

#include "tests/unit/runner/RunnerFixture.h"

namespace {
bool failSetgroups = false;
}  // namespace

// Takes the place of the C library's for the whole test program.
extern "C" __attribute__((visibility("default"))) int setgroups(size_t count,
                                                                const gid_t* groups) noexcept {
  if (failSetgroups) {
    errno = EPERM;
    return -1;
  }
  return static_cast<int>(syscall(SYS_setgroups, count, groups));
}

namespace QELO {
namespace {

constexpr int kUser = 4242;    ///< whom the method runs as
constexpr int kCaller = 4343;  ///< who started the process

class CredentialSwitch : public RunnerTest {
 protected:
  using Ids = std::array<unsigned int, 6>;  ///< real, effective and saved user, then group

  void SetUp() override {
    RunnerTest::SetUp();
    std::filesystem::permissions(directory, static_cast<std::filesystem::perms>(0755));
    platform->resetCredentials = [](const std::string&, bool keepPrivilege) {
      const uid_t other = static_cast<uid_t>(keepPrivilege ? -1 : kUser);
      return setgroups(0, nullptr) == 0 && setresgid(other, kUser, other) == 0 &&
             setresuid(other, kUser, other) == 0;
    };
  }
  static Ids CurrentIds() {
    Ids ids{};
    EXPECT_EQ(getresuid(&ids[0], &ids[1], &ids[2]), 0);
    EXPECT_EQ(getresgid(&ids[3], &ids[4], &ids[5]), 0);
    return ids;
  }
  static std::vector<gid_t> CurrentGroups() {
    std::vector<gid_t> groups(64);
    groups.resize(static_cast<size_t>(getgroups(64, groups.data())));
    return groups;
  }
  /// What a child process finds when it has these ids.
  template <typename Body>
  static void InChild(const Ids& ids, Body body) {
    if (geteuid() != 0) {
      GTEST_SKIP() << "needs root";
    }
    const pid_t child = fork();
    if (child == 0) {
      const gid_t groups[] = {7, 8};
      // Descriptions are written by the process, and taken from nobody else.
      const bool good = chown(".", ids[1], ids[4]) == 0 && setgroups(2, groups) == 0 &&
                        setresgid(ids[3], ids[4], ids[5]) == 0 &&
                        setresuid(ids[0], ids[1], ids[2]) == 0;
      _exit(good && body() ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
  bool RanAsUser() const {
    return Data()["euid"] == Json::Value(kUser) && Data()["egid"] == Json::Value(kUser);
  }
};

constexpr char kGrantable[] = R"({"grantable": true})";

TEST_F(CredentialSwitch, GrantableGivesRootsIdsAndGroupsBack) {
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    const Ids before = CurrentIds();
    const std::vector<gid_t> groups = CurrentGroups();
    return groups.size() == 2 && ProcessPlugin("state", kGrantable) && RanAsUser() &&
           CurrentIds() == before && CurrentGroups() == groups;
  });
}

TEST_F(CredentialSwitch, GrantableGivesTheIdsOfASetUserIdProgramBack) {
  const Ids started{kCaller, 0, 0, kCaller, kCaller, kCaller};
  InChild(started, [&] {
    return ProcessPlugin("state", kGrantable) && RanAsUser() && CurrentIds() == started &&
           CurrentGroups().size() == 2;
  });
}

TEST_F(CredentialSwitch, GrantableGivesIdsAndGroupsBackToAProcessThatCanBecomeRoot) {
  const Ids started{kCaller, kCaller, 0, kCaller, kCaller, 0};
  InChild(started, [&] {
    const std::vector<gid_t> groups = CurrentGroups();
    return groups.size() == 2 && ProcessPlugin("state", kGrantable) && RanAsUser() &&
           CurrentIds() == started && CurrentGroups() == groups;
  });
}

TEST_F(CredentialSwitch, FailedSwitchThatLeftOtherGroupsAloneIsUndone) {
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    platform->resetCredentials = [](const std::string&, bool) {
      setgroups(0, nullptr);
      return false;
    };
    const std::vector<gid_t> groups = CurrentGroups();
    return groups.size() == 2 && !ProcessPlugin("state") && response->GetError() == 117 &&
           CurrentGroups() == groups && CurrentIds() == Ids{0, 0, 0, 0, 0, 0};
  });
}

TEST_F(CredentialSwitch, GrantableServesASecondCall) {
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    return ProcessPlugin("state", kGrantable) && RanAsUser() &&
           ProcessPlugin("state", kGrantable) && RanAsUser() && geteuid() == 0;
  });
}

TEST_F(CredentialSwitch, GrantableGivesTheIdsBackAfterAMethodThatThrew) {
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    return !ProcessPlugin("throwing", kGrantable) && response->GetError() == 117 &&
           CurrentIds() == Ids{0, 0, 0, 0, 0, 0};
  });
}

/// A switch that leaves a way back to the former user id, the former group id, both or none.
auto switchThatKeeps(bool user, bool group) {
  return [=](const std::string&, bool) {
    const uid_t formerUser = static_cast<uid_t>(user ? -1 : kUser);
    const gid_t formerGroup = static_cast<gid_t>(group ? -1 : kUser);
    return setgroups(0, nullptr) == 0 && setresgid(formerGroup, kUser, formerGroup) == 0 &&
           setresuid(formerUser, kUser, formerUser) == 0;
  };
}

/// How often the authorisation facility was told that this call was refused.
int refusals(const std::string& call) {
  int count = 0;
  for (const SyslogCapture::Message& message : SyslogCapture::Messages()) {
    count += message.priority == (LOG_AUTH | LOG_ERR) &&
             message.text.starts_with("APIRunner.cpp:") &&
             message.text.ends_with(" ERROR: " + call + " [Operation not permitted]");
  }
  return count;
}

TEST_F(CredentialSwitch, GroupThatCannotBeGivenBackIsLoggedAndTheResultStays) {
  platform->resetCredentials = switchThatKeeps(true, false);
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    return ProcessPlugin("state", kGrantable) && RanAsUser() && response->GetError() == 0 &&
           refusals("setresgid(0, 0, 0)") == 1 && SyslogCapture::Count("ERROR: ") == 1 &&
           CurrentIds() == Ids{0, 0, 0, kUser, kUser, kUser};
  });
}

TEST_F(CredentialSwitch, UserThatCannotBeGivenBackIsLoggedAndTheResultStays) {
  platform->resetCredentials = switchThatKeeps(false, true);
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    return ProcessPlugin("state", kGrantable) && RanAsUser() && response->GetError() == 0 &&
           refusals("setresuid(0, 0, 0)") == 1 && SyslogCapture::Count("ERROR: ") == 1 &&
           CurrentIds() == Ids{kUser, kUser, kUser, 0, 0, 0};
  });
}

TEST_F(CredentialSwitch, IdsThatCannotBeGivenBackLeaveAThrowingMethodsResult) {
  platform->resetCredentials = switchThatKeeps(false, false);
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    return !ProcessPlugin("throwing", kGrantable) && response->GetError() == 117 &&
           refusals("setresgid(0, 0, 0)") == 1 && refusals("setresuid(0, 0, 0)") == 1;
  });
}

/// Groups cannot be set any more once the method has its user's.
auto switchThatKeepsGroups() {
  return [](const std::string&, bool) {
    const bool switched = setgroups(0, nullptr) == 0 && setresgid(-1U, kUser, -1U) == 0 &&
                          setresuid(-1U, kUser, -1U) == 0;
    failSetgroups = true;
    return switched;
  };
}

TEST_F(CredentialSwitch, GroupsThatCannotBeGivenBackAreLoggedAndTheResultStays) {
  platform->resetCredentials = switchThatKeepsGroups();
  for (const unsigned effective : {0, kCaller}) {
    InChild({0, effective, 0, 0, effective, 0}, [&] {
      return ProcessPlugin("state", kGrantable) && RanAsUser() && response->GetError() == 0 &&
             refusals("setgroups(2)") == 1 && SyslogCapture::Count("ERROR: ") == 1;
    });
  }
}

TEST_F(CredentialSwitch, EveryChangeOnTheWayBackIsLogged) {
  InChild({kCaller, kCaller, 0, kCaller, kCaller, 0}, [&] {
    return ProcessPlugin("state", kGrantable) &&
           SyslogCapture::Count("WARNING: setresuid(-1, 0, -1)") == 2 &&
           SyslogCapture::Count("WARNING: setgroups(2)") == 1;
  });
  InChild({kCaller, kCaller, 0, kCaller, kCaller, 0}, [&] {
    return ProcessPlugin("state", R"({"grantByDefault": true})") &&  // which leaves the groups
           SyslogCapture::Count("WARNING: setresuid(-1, 0, -1)") == 1 &&
           SyslogCapture::Count("setgroups") == 0;
  });
}

TEST_F(CredentialSwitch, ProcessThatKeepsACallersCredentialsCallsNothingElse) {
  for (const auto& keeping : std::vector<std::function<bool(const std::string&, bool)>>{
           switchThatKeeps(true, false), switchThatKeeps(false, true), switchThatKeepsGroups()}) {
    platform->resetCredentials = keeping;
    InChild({0, 0, 0, 0, 0, 0}, [&] {
      const bool first = ProcessPlugin("state", kGrantable) && response->GetError() == 0;
      const char* refused = "not called: the process has credentials of a call before";
      return first && SyslogCapture::Count(refused) == 0 && !ProcessPlugin("state") &&
             response->GetError() == 117 && SyslogCapture::Count(refused) == 1;
    });
  }
}

TEST_F(CredentialSwitch, WithoutGrantableTheUsersIdsStay) {
  InChild({0, 0, 0, 0, 0, 0}, [&] {
    return ProcessPlugin("state") && RanAsUser() &&
           CurrentIds() == Ids{kUser, kUser, kUser, kUser, kUser, kUser} &&
           CurrentGroups().empty() && setresuid(0, 0, 0) != 0;
  });
}

TEST_F(CredentialSwitch, GrantByDefaultComesBeforeTheOthers) {
  platform->resetCredentials = nullptr;
  const char* all = R"({"grantByDefault": true, "grantByUser": true, "runAs": "media"})";
  WriteDescription(Description("state", all));
  MakeRequest("QELO.Test.Call", 1, "run");
  request->InitSession(Parse(R"({"username": "alice"})"));
  TestRunner().Process(request.get(), response.get());
  for (const std::string& call : platform->calls) {
    EXPECT_EQ(call.find("ResetCredentialsByName"), std::string::npos) << call;
  }
  MakeRequest("QELO.Test.Call", 1, "run");  // and asks for no login user
  TestRunner().Process(request.get(), response.get());
  EXPECT_EQ(SyslogCapture::Count("failed to get login username"), 0);
}

TEST_F(CredentialSwitch, GrantByUserComesBeforeRunAs) {
  platform->resetCredentials = nullptr;
  Json::Value description = Description("state", R"({"grantByUser": true, "runAs": "media"})");
  description["runAs"] = "backup";
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  request->InitSession(Parse(R"({"username": "alice"})"));
  EXPECT_TRUE(TestRunner().Process(request.get(), response.get()));
  EXPECT_EQ(platform->calls.back(), "ResetCredentialsByName(alice, drop)");
}

TEST_F(CredentialSwitch, GrantByDefaultGivesBackWithoutGrantable) {
  const Ids started{kCaller, kCaller, 0, kCaller, kCaller, 0};
  WriteDescription(Description("state", R"({"grantByDefault": true})"));
  MakeRequest("QELO.Test.Call", 1, "run");
  InChild(started, [&] {
    return TestRunner().Process(request.get(), response.get()) &&
           Data()["euid"] == Json::Value(0) && Data()["egid"] == Json::Value(0) &&
           CurrentIds() == started;
  });
}

}  // namespace
}  // namespace QELO
