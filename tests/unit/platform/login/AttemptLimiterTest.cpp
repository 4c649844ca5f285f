#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <filesystem>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Session.h"

namespace {

class LoginLimiter : public PrivateRoot {
 protected:
  /// How many of so many attempts may go on.
  static int Allowed(int attempts, const std::string& address, const std::string& account) {
    int allowed = 0;
    for (int i = 0; i < attempts; ++i) {
      allowed += QeloLoginAttempt(address.c_str(), account.c_str()) == 0 ? 1 : 0;
    }
    return allowed;
  }
  static constexpr char kDir[] = "run/webapi/logins";
};

TEST_F(LoginLimiter, FiveAttemptsOfAnAddressAtAnAccountMayGoOn) {
  EXPECT_EQ(Allowed(10, kAddress, "alice"), 5);
  const int wait = QeloLoginAttempt(kAddress, "alice");
  EXPECT_GT(wait, 290);
  EXPECT_LE(wait, 300);
}

TEST_F(LoginLimiter, OtherAccountsAndAddressesHaveCountsOfTheirOwn) {
  EXPECT_EQ(Allowed(6, kAddress, "alice"), 5);
  EXPECT_EQ(Allowed(6, kAddress, "bob"), 5);
  EXPECT_EQ(Allowed(6, kAddress, "Alice"), 5);
  EXPECT_EQ(Allowed(6, "192.0.2.8", "alice"), 5);
}

TEST_F(LoginLimiter, TwentyAttemptsOfAnAddressMayGoOn) {
  int allowed = 0;
  for (int i = 0; i < 30; ++i) {
    allowed += Allowed(1, kAddress, "user" + std::to_string(i));
  }
  EXPECT_EQ(allowed, 20);
  EXPECT_GT(QeloLoginAttempt(kAddress, "fresh"), 0);
  EXPECT_EQ(QeloLoginAttempt("192.0.2.8", "fresh"), 0);
}

TEST_F(LoginLimiter, SettingsChangeTheLimits) {
  Set({{"login_attempts", "2"}, {"login_attempts_per_address", "3"}, {"login_window", "60"}});
  EXPECT_EQ(Allowed(5, kAddress, "alice"), 2);
  EXPECT_LE(QeloLoginAttempt(kAddress, "alice"), 60);
  EXPECT_EQ(Allowed(5, kAddress, "bob"), 1);
}

TEST_F(LoginLimiter, SettingsThatAreNoNumberDoNotOpenTheGate) {
  Set({{"login_attempts", "0"}, {"login_attempts_per_address", "-1"}, {"login_window", "soon"}});
  EXPECT_EQ(Allowed(10, kAddress, "alice"), 5);
}

TEST_F(LoginLimiter, WindowThatIsOverStartsAgain) {
  Set({{"login_window", "1"}});
  EXPECT_EQ(Allowed(6, kAddress, "alice"), 5);
  const int wait = QeloLoginAttempt(kAddress, "alice");
  EXPECT_EQ(wait, 1);
  sleep(2);
  EXPECT_EQ(QeloLoginAttempt(kAddress, "alice"), 0);
}

TEST_F(LoginLimiter, SuccessClearsTheAccountsCount) {
  EXPECT_EQ(Allowed(5, kAddress, "alice"), 5);
  QeloLoginSucceeded(kAddress, "alice");
  EXPECT_EQ(Allowed(10, kAddress, "alice"), 5);
}

TEST_F(LoginLimiter, SuccessGivesTheAddressOneBack) {
  Set({{"login_attempts", "100"}, {"login_attempts_per_address", "3"}});
  EXPECT_EQ(Allowed(3, kAddress, "alice"), 3);
  QeloLoginSucceeded(kAddress, "alice");
  EXPECT_EQ(Allowed(3, kAddress, "bob"), 1);
}

TEST_F(LoginLimiter, SuccessWithoutAttemptsChangesNothing) {
  QeloLoginSucceeded(kAddress, "alice");
  EXPECT_EQ(Allowed(6, kAddress, "alice"), 5);
}

TEST_F(LoginLimiter, AddressesOfOneNetworkOf64BitsCountTogether) {
  Set({{"login_attempts_per_address", "3"}});
  EXPECT_EQ(Allowed(2, "2001:db8:1:2::1", "alice"), 2);
  EXPECT_EQ(Allowed(2, "2001:db8:1:2:ffff::1", "bob"), 1);
  EXPECT_EQ(Allowed(2, "2001:db8:1:3::1", "bob"), 2);
}

TEST_F(LoginLimiter, SpellingsOfOneAddressCountTogether) {
  EXPECT_EQ(Allowed(3, "192.0.2.9", "alice"), 3);
  EXPECT_EQ(Allowed(3, "::ffff:192.0.2.9", "alice"), 2);
}

TEST_F(LoginLimiter, UnknownAddressesCountTogether) {
  Set({{"login_attempts_per_address", "3"}});
  EXPECT_EQ(Allowed(2, "", "alice"), 2);
  EXPECT_EQ(Allowed(2, "../../x", "bob"), 1);
}

TEST_F(LoginLimiter, AccountNamesReachNoOtherFile) {
  for (const std::string& account :
       {std::string("../../x"), std::string("a/b"), std::string("."), std::string(".lock"),
        std::string("\xff\x01"), std::string(64, 'x')}) {
    EXPECT_EQ(QeloLoginAttempt(kAddress, account.c_str()), 0) << account;
  }
  EXPECT_EQ(CountFiles(kDir), 7);
  EXPECT_TRUE(std::filesystem::exists(Path(std::string(kDir) + "/c0000207-2e2e2f2e2e2f78")));
}

TEST_F(LoginLimiter, LongAndEmptyAccountsCountUnderTheAddressAlone) {
  const std::string longName(65, 'x');
  EXPECT_EQ(Allowed(12, kAddress, longName), 12);
  EXPECT_EQ(Allowed(12, kAddress, ""), 8);
  EXPECT_EQ(CountFiles(kDir), 1);
  QeloLoginSucceeded(kAddress, longName.c_str());
  EXPECT_EQ(Allowed(2, kAddress, longName), 1);
}

TEST_F(LoginLimiter, StaleCountsArePurged) {
  EXPECT_EQ(QeloLoginAttempt("192.0.2.8", "alice"), 0);
  const std::string stale = std::string(kDir) + "/c0000208";
  Age(stale, 400);
  Age(std::string(kDir) + "/.purged", 100);
  EXPECT_EQ(QeloLoginAttempt(kAddress, "bob"), 0);
  EXPECT_FALSE(std::filesystem::exists(Path(stale)));
  EXPECT_TRUE(std::filesystem::exists(Path(stale + "-616c696365")));
  EXPECT_TRUE(std::filesystem::exists(Path(std::string(kDir) + "/.lock")));
}

TEST_F(LoginLimiter, PurgeLooksOnceAMinute) {
  EXPECT_EQ(QeloLoginAttempt("192.0.2.8", "alice"), 0);
  const std::string stale = std::string(kDir) + "/c0000208";
  Age(stale, 400);
  EXPECT_EQ(QeloLoginAttempt(kAddress, "bob"), 0);
  EXPECT_TRUE(std::filesystem::exists(Path(stale)));
}

TEST_F(LoginLimiter, CountCutShortStartsAgain) {
  EXPECT_EQ(Allowed(6, kAddress, "alice"), 5);
  std::filesystem::resize_file(Path(std::string(kDir) + "/c0000207-616c696365"), 3);
  EXPECT_EQ(Allowed(6, kAddress, "alice"), 5);
}

TEST_F(LoginLimiter, CountFromTheFutureIsKept) {
  EXPECT_EQ(Allowed(5, kAddress, "alice"), 5);
  const std::string file = Path(std::string(kDir) + "/c0000207-616c696365");
  const int64_t count[2] = {time(nullptr) + 100000, 5};
  FILE* opened = fopen(file.c_str(), "r+");
  ASSERT_NE(opened, nullptr);
  EXPECT_EQ(fwrite(count, sizeof count, 1, opened), 1U);
  fclose(opened);
  const int wait = QeloLoginAttempt(kAddress, "alice");
  EXPECT_GT(wait, 0);
  EXPECT_LE(wait, 300);
}

TEST_F(LoginLimiter, DirectoryIsMadeForRootAlone) {
  std::filesystem::remove_all(Path("run"));
  EXPECT_EQ(QeloLoginAttempt(kAddress, "alice"), 0);
  EXPECT_EQ(Status(kDir).st_mode, S_IFDIR | 0700U);
}

TEST_F(LoginLimiter, AttemptThatCannotBeCountedDoesNotGoOn) {
  ASSERT_EQ(chmod(Path(kDir).c_str(), 0777), 0);
  EXPECT_EQ(QeloLoginAttempt(kAddress, "alice"), -1);
  EXPECT_EQ(SyslogCapture::Count("cannot count a login attempt in " + Path(kDir)), 1);
  QeloLoginSucceeded(kAddress, "alice");
}

TEST_F(LoginLimiter, LockThatIsHeldEndsTheAttemptInTime) {
  const std::string lock = Path(std::string(kDir) + "/.lock");
  const int fd = open(lock.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  ASSERT_EQ(flock(fd, LOCK_EX), 0);
  const time_t start = time(nullptr);
  EXPECT_EQ(QeloLoginAttempt(kAddress, "alice"), -1);
  EXPECT_LE(time(nullptr) - start, 5);
  close(fd);
}

TEST_F(LoginLimiter, CountThatCannotBeReadDoesNotGoOn) {
  std::filesystem::create_directory(Path(std::string(kDir) + "/c0000207"));
  EXPECT_EQ(QeloLoginAttempt(kAddress, "alice"), -1);
}

TEST_F(LoginLimiter, CountThatCannotBeWrittenDoesNotGoOn) {
  EXPECT_EQ(
      InChild([] {
        const rlimit none{0, 0};
        signal(SIGXFSZ, SIG_IGN);
        if (setrlimit(RLIMIT_FSIZE, &none) != 0 || QeloLoginAttempt(kAddress, "alice") != -1) {
          return 1;
        }
        return SyslogCapture::Count("cannot keep the count of login attempts in ") == 1 ? 0 : 2;
      }),
      0);
}

TEST_F(LoginLimiter, ProcessesTogetherGetNoMoreThanTheLimit) {
  Set({{"login_attempts", "50"}, {"login_attempts_per_address", "1000"}});
  std::array<pid_t, 16> children{};
  for (pid_t& child : children) {
    child = fork();
    if (child == 0) {
      _exit(Allowed(10, kAddress, "alice"));
    }
  }
  int allowed = 0;
  for (const pid_t child : children) {
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    allowed += WEXITSTATUS(status);
  }
  EXPECT_EQ(allowed, 50);
}

}  // namespace
