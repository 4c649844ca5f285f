#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <vector>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Session.h"

namespace {

class Passwords : public PrivateRoot {
 protected:
  int Check(const char* account, const char* password, int size = 64) {
    user_[0] = 'x';
    user_[1] = '\0';
    const int result = QeloLoginPasswordCheck(account, password, "192.0.2.7", user_, size);
    EXPECT_EQ(result == 1, user_[0] != '\0') << user_;
    return result;
  }

  /// The hash of an account's password.
  static std::string HashOf(const std::string& account) {
    const std::string text = Read("etc/shadow");
    const size_t start = text.find(account + ":") + account.size() + 1;
    return text.substr(start, text.find(':', start) - start);
  }

  /// Gives alice's line of the shadow file new fields, from the hash on.
  static void SetShadow(const std::string& fields) {
    Write("etc/shadow", "bob:" + HashOf("bob") + ":20000:0:99999:7:::\nalice:" + fields + "\n");
  }

  char user_[64] = "";
};

TEST_F(Passwords, RightPasswordGivesTheAccountsName) {
  EXPECT_EQ(Check("alice", "alice-pw"), 1);
  EXPECT_STREQ(user_, "alice");
  EXPECT_EQ(Check("admin", "admin-pw"), 1);
}

TEST_F(Passwords, WrongPasswordIsRefused) {
  for (const char* wrong : {"", "alice", "alice-pw ", "Alice-pw", "bob-pw"}) {
    EXPECT_EQ(Check("alice", wrong), 0) << wrong;
  }
  EXPECT_EQ(Check("alice", std::string(600, 'x').c_str()), 0);
  EXPECT_EQ(Check("alice", std::string(100000, 'x').c_str()), 0);
}

TEST_F(Passwords, UnknownAccountIsRefused) {
  for (const char* unknown : {"zoe", "", "Alice", "alice ", "alice:", "alice\n", "../alice"}) {
    EXPECT_EQ(Check(unknown, "alice-pw"), 0) << unknown;
  }
}

TEST_F(Passwords, AccountsWithoutLoginAreRefused) {
  const std::string hash = HashOf("alice");
  Write("etc/passwd",
        "alice:x:1:1::/:/usr/sbin/nologin\nbob:x:2:2::/:/bin/false\nsystem:x:3:3::/:/bin/sh\n"
        "carol:x:4:4::/:/bin/sh\ndave:x:5:5::/:\n");
  std::string shadow;
  for (const char* account : {"alice", "bob", "system", "carol", "dave"}) {
    shadow += std::string(account) + ":" + hash + ":20000:0:99999:7:::\n";
  }
  Write("etc/shadow", shadow);
  EXPECT_EQ(Check("alice", "alice-pw"), 2);
  EXPECT_EQ(Check("bob", "alice-pw"), 2);
  EXPECT_EQ(Check("system", "alice-pw"), 2);
  EXPECT_EQ(Check("carol", "alice-pw"), 1);
  EXPECT_EQ(Check("dave", "alice-pw"), 1);
}

TEST_F(Passwords, LockedAndEmptyHashesAreRefused) {
  const std::string hash = HashOf("alice");
  for (const std::string& locked : {std::string(), std::string("!"), std::string("*"),
                                    std::string("!!"), "!" + hash, "*" + hash}) {
    SetShadow(locked + ":20000:0:99999:7:::");
    EXPECT_EQ(Check("alice", "alice-pw"), 0) << locked;
    EXPECT_EQ(Check("alice", ""), 0) << locked;
  }
}

TEST_F(Passwords, AccountWithoutShadowLineIsRefused) {
  Write("etc/shadow", "bob:" + HashOf("bob") + ":20000:0:99999:7:::\n");
  EXPECT_EQ(Check("alice", "alice-pw"), 0);
  EXPECT_EQ(Check("alice", "bob-pw"), 0);
  EXPECT_EQ(Check("bob", "bob-pw"), 1);
}

TEST_F(Passwords, HashOfAnUnknownSchemeIsRefused) {
  SetShadow("$nonsense$x:20000:0:99999:7:::");
  EXPECT_EQ(Check("alice", "alice-pw"), 0);
}

TEST_F(Passwords, ShadowFileWithoutAnyHashRefusesEverybody) {
  Write("etc/shadow", "alice:!:20000:0:99999:7:::\n");
  EXPECT_EQ(Check("alice", "alice-pw"), 0);
  EXPECT_EQ(Check("zoe", "x"), 0);
}

TEST_F(Passwords, AccountIsRefusedFromItsExpiryOn) {
  const std::string hash = HashOf("alice");
  SetShadow(hash + ":20000:0:99999:7::" + std::to_string(Today() + 1) + ":");
  EXPECT_EQ(Check("alice", "alice-pw"), 1);
  SetShadow(hash + ":20000:0:99999:7::" + std::to_string(Today()) + ":");
  EXPECT_EQ(Check("alice", "alice-pw"), 2);
}

TEST_F(Passwords, PasswordThatMustBeChangedIsRefused) {
  const std::string hash = HashOf("alice");
  SetShadow(hash + ":0:0:99999:7:::");
  EXPECT_EQ(Check("alice", "alice-pw"), 2);
  SetShadow(hash + ":" + std::to_string(Today() - 31) + ":0:30:7:::");
  EXPECT_EQ(Check("alice", "alice-pw"), 2);
  SetShadow(hash + ":" + std::to_string(Today() - 30) + ":0:30:7:::");
  EXPECT_EQ(Check("alice", "alice-pw"), 1);
  SetShadow(hash + ":::::::");
  EXPECT_EQ(Check("alice", "alice-pw"), 1);
}

TEST_F(Passwords, UnknownAndBarredAccountsTakeAsLongAsAWrongPassword) {
  const auto fastest = [this](const char* account) {
    std::vector<double> times;
    for (int i = 0; i < 7; ++i) {
      const auto start = std::chrono::steady_clock::now();
      EXPECT_EQ(Check(account, "wrong"), 0);
      times.push_back(
          std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count());
    }
    return *std::min_element(times.begin(), times.end());
  };
  // A hash takes milliseconds, everything else together a tenth of one.
  const double wrong = fastest("alice");
  EXPECT_NEAR(fastest("zoe") / wrong, 1.0, 0.5);
  EXPECT_NEAR(fastest("system") / wrong, 1.0, 0.5);
}

TEST_F(Passwords, NameThatDoesNotFitIsNotRight) {
  EXPECT_EQ(Check("alice", "alice-pw", 5), -1);
  EXPECT_EQ(Check("alice", "alice-pw", 6), 1);
}

TEST_F(Passwords, MissingArgumentsCannotBeChecked) {
  EXPECT_EQ(QeloLoginPasswordCheck(nullptr, "x", "", user_, sizeof user_), -1);
  EXPECT_EQ(QeloLoginPasswordCheck("alice", nullptr, "", user_, sizeof user_), -1);
}

TEST_F(Passwords, MissingFilesCannotBeChecked) {
  ASSERT_EQ(remove(Path("etc/shadow").c_str()), 0);
  EXPECT_EQ(Check("alice", "alice-pw"), -1);
  EXPECT_EQ(SyslogCapture::Count("cannot read the accounts [No such file or directory]"), 1);
  ASSERT_EQ(remove(Path("etc/passwd").c_str()), 0);
  EXPECT_EQ(Check("alice", "alice-pw"), -1);
  EXPECT_EQ(SyslogCapture::Count("cannot read the accounts ["), 2);
}

class PasswordModule : public Passwords {
 protected:
  /// Whether a process that has not loaded the module yet logs this text when it cannot check.
  void ExpectFailureInFreshProcess(const std::function<void()>& prepare, const std::string& log) {
    testing::GTEST_FLAG(death_test_style) = "threadsafe";
    EXPECT_EXIT(
        {
          prepare();
          _exit(Check("alice", "alice-pw") == -1 && SyslogCapture::Count(log) == 1 ? 0 : 1);
        },
        testing::ExitedWithCode(0), "");
  }
};

TEST_F(PasswordModule, MissingModuleCannotCheck) {
  ASSERT_EQ(remove(Path("modules/password_crypt.so").c_str()), 0);
  EXPECT_EQ(Check("alice", "alice-pw"), -1);
  EXPECT_EQ(SyslogCapture::Count("refused to load " + Path("modules/password_crypt.so")), 1);
}

TEST_F(PasswordModule, ModuleThatOthersMayWriteIsRefused) {
  for (const mode_t mode : {0664U, 0646U, 0777U}) {
    ASSERT_EQ(chmod(Path("modules/password_crypt.so").c_str(), mode), 0);
    EXPECT_EQ(Check("alice", "alice-pw"), -1) << mode;
  }
  EXPECT_EQ(SyslogCapture::Count("refused to load "), 3);
}

TEST_F(PasswordModule, DirectoryThatOthersMayWriteIsRefused) {
  for (const mode_t mode : {0775U, 0757U, 01777U}) {
    ASSERT_EQ(chmod(Path("modules").c_str(), mode), 0);
    EXPECT_EQ(Check("alice", "alice-pw"), -1) << mode;
  }
}

TEST_F(PasswordModule, ModuleOrDirectoryOfAnotherUserIsRefused) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root gives files away";
  }
  ASSERT_EQ(chown(Path("modules/password_crypt.so").c_str(), 1002, 0), 0);
  EXPECT_EQ(Check("alice", "alice-pw"), -1);
  ASSERT_EQ(chown(Path("modules/password_crypt.so").c_str(), 0, 0), 0);
  EXPECT_EQ(Check("alice", "alice-pw"), 1);
  ASSERT_EQ(chown(Path("modules").c_str(), 1002, 0), 0);
  EXPECT_EQ(Check("alice", "alice-pw"), -1);
}

TEST_F(PasswordModule, SymbolicLinkIsRefused) {
  const std::string module = Path("modules/password_crypt.so");
  ASSERT_EQ(rename(module.c_str(), Path("modules/real.so").c_str()), 0);
  ASSERT_EQ(symlink("real.so", module.c_str()), 0);
  EXPECT_EQ(Check("alice", "alice-pw"), -1);
}

TEST_F(PasswordModule, FileThatIsNoModuleIsRefused) {
  const std::string module = Path("modules/password_crypt.so");
  ExpectFailureInFreshProcess(
      [&] {
        remove(module.c_str());
        Write("modules/password_crypt.so", "no library");
      },
      "cannot load " + module + " [");
}

TEST_F(PasswordModule, ModuleWithoutTheFunctionIsRefused) {
  const std::string module = Path("modules/password_crypt.so");
  ExpectFailureInFreshProcess([&] { rename(Path("modules/tokens.so").c_str(), module.c_str()); },
                              "webapiPasswordVerify");
}

}  // namespace
