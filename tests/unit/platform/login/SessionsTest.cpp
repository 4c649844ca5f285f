#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <set>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "tests/unit/platform/login/SessionFixture.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Session.h"

namespace {

bool noRandomBytes = false;

}  // namespace

// Takes the place of the C library's for the whole test program.
extern "C" __attribute__((visibility("default"))) ssize_t getrandom(void* bytes, size_t size,
                                                                    unsigned flags) noexcept {
  if (noRandomBytes) {
    errno = ENOSYS;
    return -1;
  }
  return syscall(SYS_getrandom, bytes, size, flags);
}

namespace {

using Sessions = SessionFixture;

TEST_F(Sessions, CreateFailsAndLogsWithoutRandomBytes) {
  noRandomBytes = true;
  EXPECT_EQ(TryCreate("alice", kAddress), -1);
  noRandomBytes = false;
  EXPECT_EQ(SyslogCapture::Count("no random bytes [Function not implemented]"), 1);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 0);
}

TEST_F(Sessions, CreateGivesTwoSecretsOf43Characters) {
  char id[QELO_SESSION_ID_LENGTH + 1];
  char token[QELO_SESSION_ID_LENGTH + 1];
  ASSERT_EQ(QeloSessionCreate("alice", kAddress, id, token), 0);
  for (const std::string text : {id, token}) {
    EXPECT_EQ(text.size(), 43U);
    EXPECT_EQ(
        text.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_"),
        std::string::npos);
  }
  EXPECT_STRNE(id, token);
}

TEST_F(Sessions, CreateMakesTheUsersPlaceForTasks) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root makes it";
  }
  const std::string place = "var/lib/webapi/tasks/1002";
  Create();
  EXPECT_EQ(Status(place).st_uid, 1002U);
  EXPECT_EQ(Status(place).st_gid, 1002U);
  EXPECT_EQ(Status(place).st_mode, S_IFDIR | 0700U);
  const ino_t first = Status(place).st_ino;
  Create();
  EXPECT_EQ(Status(place).st_ino, first);
  EXPECT_EQ(CountFiles("var/lib/webapi/tasks"), 3) << "root's and the working account's are there";
}

TEST_F(Sessions, CreateSetsAStrangersPlaceForTasksAside) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root makes it";
  }
  const std::string place = "var/lib/webapi/tasks/1002";
  ASSERT_EQ(mkdir(Path(place).c_str(), 0700), 0);
  ASSERT_EQ(chown(Path(place).c_str(), 1003, 1003), 0);
  Create();
  EXPECT_EQ(Status(place).st_uid, 1002U);
  EXPECT_EQ(CountFiles("var/lib/webapi/tasks"), 4);
  EXPECT_EQ(SyslogCapture::Count("somebody else made the task store"), 1);
}

TEST_F(Sessions, CreateNeverGivesAnIdTwice) {
  Set({{"session_limit", "1000"}});
  std::set<std::string> seen;
  for (int i = 0; i < 200; ++i) {
    const Ticket ticket = Create();
    EXPECT_TRUE(seen.insert(ticket.id).second);
    EXPECT_TRUE(seen.insert(ticket.token).second);
  }
}

TEST_F(Sessions, FileHoldsTheRecordForRootAlone) {
  const Ticket ticket = Create();
  Json::Value record;
  ASSERT_TRUE(QELO::JsonHelper::fromString(Read(File(ticket)), record));
  EXPECT_EQ(record["user"], Json::Value("alice"));
  EXPECT_EQ(QELO::JsonHelper::asInt64(record["uid"]), IsRoot() ? 1002 : geteuid());
  EXPECT_EQ(record["address"], Json::Value(kAddress));
  EXPECT_EQ(record["token"], Json::Value(ticket.token));
  EXPECT_NEAR(static_cast<double>(QELO::JsonHelper::asInt64(record["created"])),
              static_cast<double>(time(nullptr)), 3);
  EXPECT_FALSE(record.isMember("skipCheckIP"));
  EXPECT_EQ(Status(File(ticket)).st_mode, S_IFREG | 0600U);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 1);
}

TEST_F(Sessions, CreateMakesItsDirectoryForRootAlone) {
  std::filesystem::remove_all(Path("run"));
  Create();
  EXPECT_EQ(Status("run/webapi/sessions").st_mode, S_IFDIR | 0700U);
}

TEST_F(Sessions, CreateForAnUnknownUserFails) {
  EXPECT_EQ(TryCreate("zoe", kAddress), -1);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 0);
}

TEST_F(Sessions, CreateWithoutAddressFailsUnlessAddressesAreNotChecked) {
  EXPECT_EQ(TryCreate("alice", ""), -1);
  EXPECT_EQ(TryCreate("alice", "nonsense"), -1);
  Set({{"skip_check_ip", "yes"}});
  EXPECT_EQ(TryCreate("alice", ""), 0);
}

TEST_F(Sessions, SettingUnbindsNewSessionsFromTheAddress) {
  Set({{"skip_check_ip", "yes"}});
  Json::Value record;
  ASSERT_TRUE(QELO::JsonHelper::fromString(Read(File(Create())), record));
  EXPECT_EQ(record["skipCheckIP"], Json::Value(true));
}

TEST_F(Sessions, CreateRefusesADirectoryThatOthersMayUse) {
  ASSERT_EQ(chmod(Path("run/webapi/sessions").c_str(), 0755), 0);
  EXPECT_EQ(TryCreate("alice", kAddress), -1);
  EXPECT_EQ(SyslogCapture::Count("cannot use " + Path("run/webapi/sessions") +
                                 " [Operation not permitted]"),
            1);
}

TEST_F(Sessions, CreateRefusesADirectoryThatIsALink) {
  std::filesystem::rename(Path("run/webapi/sessions"), Path("run/elsewhere"));
  ASSERT_EQ(symlink(Path("run/elsewhere").c_str(), Path("run/webapi/sessions").c_str()), 0);
  EXPECT_EQ(TryCreate("alice", kAddress), -1);
  EXPECT_EQ(CountFiles("run/elsewhere"), 0);
}

TEST_F(Sessions, CreateRefusesADirectoryOfAnotherUser) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root gives directories away";
  }
  ASSERT_EQ(chown(Path("run/webapi/sessions").c_str(), 1002, 1002), 0);
  EXPECT_EQ(TryCreate("alice", kAddress), -1);
}

TEST_F(Sessions, CreateFailsAndLogsWhenTheRecordCannotBeWritten) {
  EXPECT_EQ(InChild([] {
              const rlimit none{0, 0};
              signal(SIGXFSZ, SIG_IGN);
              if (setrlimit(RLIMIT_FSIZE, &none) != 0 || TryCreate("alice", kAddress) != -1) {
                return 1;
              }
              return SyslogCapture::Count("cannot write a session [File too large]") == 1 ? 0 : 2;
            }),
            0);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 0);
}

TEST_F(Sessions, CreateBeyondTheLimitEndsTheSessionUsedLongestAgo) {
  Set({{"session_limit", "3"}});
  const Ticket first = Create();
  const Ticket second = Create();
  const Ticket third = Create();
  const Ticket other = Create("bob");
  Age(File(first), 10);
  Age(File(second), 30);
  Age(File(third), 20);
  Age(File(other), 40);
  const Ticket fourth = Create();
  EXPECT_LT(SecondsLeft(second), 0);
  for (const Ticket& kept : {first, third, fourth, other}) {
    EXPECT_GE(SecondsLeft(kept), 0);
  }
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 4);
  Set({{"session_limit", "1"}});
  EXPECT_GE(SecondsLeft(Create()), 0);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 2);
}

TEST_F(Sessions, NewSessionStaysThoughOthersSeemToBeUsedLater) {
  Set({{"session_limit", "2"}});
  Age(File(Create()), -100);
  Age(File(Create()), -100);
  EXPECT_GE(SecondsLeft(Create()), 0);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 2);
}

TEST_F(Sessions, LimitIs64UnlessItIsSet) {
  for (int i = 0; i < 70; ++i) {
    Create();
  }
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 64);
}

TEST_F(Sessions, SessionsThatEndedDoNotCountForTheLimit) {
  Set({{"session_limit", "2"}});
  const Ticket first = Create();
  const Ticket second = Create();
  const Ticket third = Create("bob");
  EXPECT_EQ(QeloSessionRemove(second.id.c_str()), 0);
  ASSERT_EQ(remove(Path(File(third)).c_str()), 0);  // as the purge does
  Create();
  Create("bob");
  Create("bob");
  EXPECT_GE(SecondsLeft(first), 0);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 4);
}

TEST_F(Sessions, LimitHoldsWhenProcessesLogInAtOnce) {
  Set({{"session_limit", "5"}});
  std::vector<pid_t> children;
  for (int i = 0; i < 8; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      int failures = 0;
      for (int n = 0; n < 10; ++n) {
        failures += TryCreate("alice", kAddress) == 0 ? 0 : 1;
      }
      _exit(failures);
    }
    children.push_back(child);
  }
  for (const pid_t child : children) {
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
  EXPECT_LE(CountFiles("run/webapi/sessions"), 5);
  EXPECT_GE(CountFiles("run/webapi/sessions"), 1);
}

TEST_F(Sessions, LogoutAndPurgeLeaveNothingOfASession) {
  const std::string index =
      "run/webapi/sessions/.users/" + std::to_string(IsRoot() ? 1002 : geteuid()) + "-616c696365";
  const Ticket first = Create();
  const Ticket second = Create();
  EXPECT_EQ(CountFiles(index), 2);
  QeloSessionRemove(first.id.c_str());
  EXPECT_EQ(CountFiles(index), 1);
  Age(File(second), 9000 + 10);
  Set({{"session_purge_pause", "0"}});
  Create("bob");
  EXPECT_EQ(CountFiles(index), 0);
}

TEST_F(Sessions, PurgeWaitsForItsPause) {
  const Ticket old = Create();
  Age(File(old), 9000 + 10);
  Create();
  EXPECT_TRUE(std::filesystem::exists(Path(File(old))));
  Age("run/webapi/sessions/.purged", 590);
  Create();
  EXPECT_TRUE(std::filesystem::exists(Path(File(old))));
  Age("run/webapi/sessions/.purged", 602);
  Create();
  EXPECT_FALSE(std::filesystem::exists(Path(File(old))));
}

TEST_F(Sessions, CreatePurgesSessionsThatTimedOutLongAgo) {
  Set({{"session_purge_pause", "0"}});
  const Ticket recent = Create();
  const Ticket old = Create();
  Age(File(recent), 9000 - 10);
  Age(File(old), 9000 + 10);
  Write("run/webapi/sessions/new-leftover", "{");
  Age("run/webapi/sessions/new-leftover", 9000 + 10);
  Create();
  EXPECT_TRUE(std::filesystem::exists(Path(File(recent))));
  EXPECT_FALSE(std::filesystem::exists(Path(File(old))));
  EXPECT_FALSE(std::filesystem::exists(Path("run/webapi/sessions/new-leftover")));
}

TEST_F(Sessions, PurgeLeavesLinksAndDirectoriesAlone) {
  Write("etc/victim", "content");
  Age("etc/victim", 100000);
  ASSERT_EQ(symlink(Path("etc/victim").c_str(), Path("run/webapi/sessions/link").c_str()), 0);
  std::filesystem::create_directory(Path("run/webapi/sessions/dir"));
  Age("run/webapi/sessions/dir", 100000);
  Create();
  EXPECT_EQ(Read("etc/victim"), "content");
  EXPECT_TRUE(std::filesystem::exists(Path("run/webapi/sessions/dir")));
}

TEST_F(Sessions, RemoveEndsTheSession) {
  const Ticket ticket = Create();
  EXPECT_EQ(QeloSessionRemove(ticket.id.c_str()), 0);
  EXPECT_EQ(QeloSessionRemove(ticket.id.c_str()), -1);
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 0);
}

TEST_F(Sessions, TextsThatAreNoIdReachNoFile) {
  Write("run/webapi/x", "content");
  Write("run/webapi/sessions/" + std::string(42, 'a') + ".", "content");
  const std::string inside(43 - 12, 'a');
  const std::string wrong[] = {"",
                               "../x",
                               "..",
                               ".",
                               std::string(43, '.'),
                               std::string(42, 'a'),
                               std::string(44, 'a'),
                               std::string(42, 'a') + "/",
                               std::string(42, 'a') + ".",
                               std::string(42, 'a') + "%",
                               "../../../../" + inside,
                               std::string(5000, 'a')};
  for (const std::string& id : wrong) {
    EXPECT_EQ(QeloSessionRemove(id.c_str()), -1) << id;
    EXPECT_EQ(QeloSessionRefresh(id.c_str()), -1) << id;
    EXPECT_LT(QeloSessionSecondsLeft(id.c_str()), 0) << id;
  }
  EXPECT_EQ(Read("run/webapi/x"), "content");
  EXPECT_EQ(CountFiles("run/webapi/sessions"), 1);
}

TEST_F(Sessions, SecondsLeftCountDownFromTheTimeout) {
  const Ticket ticket = Create();
  EXPECT_NEAR(static_cast<double>(SecondsLeft(ticket)), 900, 2);
  Age(File(ticket), 300);
  EXPECT_NEAR(static_cast<double>(SecondsLeft(ticket)), 600, 2);
  Age(File(ticket), 902);
  EXPECT_LT(SecondsLeft(ticket), 0);
  Set({{"session_timeout", "2000"}});
  EXPECT_NEAR(static_cast<double>(SecondsLeft(ticket)), 1098, 2);
}

TEST_F(Sessions, SecondsLeftOfNoSessionAreNegative) {
  EXPECT_LT(QeloSessionSecondsLeft(std::string(43, 'a').c_str()), 0);
  std::filesystem::remove_all(Path("run"));
  EXPECT_LT(QeloSessionSecondsLeft(std::string(43, 'a').c_str()), 0);
}

TEST_F(Sessions, LastUseInTheFutureCountsAsNow) {
  const Ticket ticket = Create();
  Age(File(ticket), -100000);
  EXPECT_EQ(SecondsLeft(ticket), 900);
  EXPECT_EQ(QeloSessionRefresh(ticket.id.c_str()), 0);
  EXPECT_LE(Status(File(ticket)).st_mtim.tv_sec, time(nullptr));
}

TEST_F(Sessions, RefreshMakesNowTheLastUse) {
  const Ticket ticket = Create();
  Age(File(ticket), 300);
  EXPECT_EQ(QeloSessionRefresh(ticket.id.c_str()), 0);
  EXPECT_NEAR(static_cast<double>(SecondsLeft(ticket)), 900, 2);
}

TEST_F(Sessions, RefreshWithinASecondWritesNothing) {
  const Ticket ticket = Create();
  const timespec before = Status(File(ticket)).st_mtim;
  EXPECT_EQ(QeloSessionRefresh(ticket.id.c_str()), 0);
  const timespec after = Status(File(ticket)).st_mtim;
  EXPECT_EQ(before.tv_sec, after.tv_sec);
  EXPECT_EQ(before.tv_nsec, after.tv_nsec);
}

TEST_F(Sessions, RefreshDoesNotReviveATimedOutSession) {
  const Ticket ticket = Create();
  Age(File(ticket), 1000);
  EXPECT_EQ(QeloSessionRefresh(ticket.id.c_str()), -1);
  EXPECT_LT(SecondsLeft(ticket), 0);
}

TEST_F(Sessions, RefreshOfNoSessionFails) {
  EXPECT_EQ(QeloSessionRefresh(std::string(43, 'a').c_str()), -1);
}

}  // namespace
