#include <dlfcn.h>
#include <gtest/gtest.h>
#include <pwd.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "platform/login/Passwords.h"
#include "platform/login/module/PasswordPam.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/BuiltModules.h"

namespace {

class HostPasswords : public testing::Test {
 protected:
  void SetUp() override {
    SyslogCapture::Clear();
    ASSERT_EQ(chmod(Module().c_str(), 0755), 0);
  }

  static std::string Module() { return std::string(FAKE_MODULE_DIR) + "/" + kPasswordPamModule; }

  /// The check's result when PAM answers like this.
  int Check(int result, const char* user) {
    setenv("FAKE_PAM_RESULT", std::to_string(result).c_str(), 1);
    setenv("FAKE_PAM_USER", user, 1);
    setenv("FAKE_PAM_ADDRESS", "192.0.2.7", 1);
    name_ = "before";
    return QELO::Platform::checkPassword("any", "password", "192.0.2.7", name_);
  }

  /// An account of the host that may log in, or "".
  static std::string UserWithShell() {
    setpwent();
    const passwd* entry = getpwent();
    while (entry != nullptr && std::string(entry->pw_shell).find("sh") == std::string::npos) {
      entry = getpwent();
    }
    return entry != nullptr ? entry->pw_name : "";
  }

  std::string name_;
};

TEST_F(HostPasswords, NameIsTheOneThatPamGives) {
  const std::string user = UserWithShell();
  if (user.empty()) {
    GTEST_SKIP() << "no account of this host has a shell";
  }
  EXPECT_EQ(Check(1, user.c_str()), 1);
  EXPECT_EQ(name_, user);
}

TEST_F(HostPasswords, RefusalIsARefusal) {
  EXPECT_EQ(Check(0, "root"), 0);
  EXPECT_EQ(name_, "before");
  EXPECT_EQ(SyslogCapture::Count(""), 0);
}

TEST_F(HostPasswords, AccountThatPamRefusesIsBarred) {
  EXPECT_EQ(Check(2, ""), 2);
  EXPECT_EQ(name_, "before");
}

TEST_F(HostPasswords, NameThatTheHostDoesNotKnowIsRefused) {
  EXPECT_EQ(Check(1, "nobody-of-this-name"), 0);
  EXPECT_EQ(Check(1, ""), 0);
}

TEST_F(HostPasswords, AccountWithoutShellIsRefusedThoughPamLetsItIn) {
  if (getpwnam("daemon") == nullptr) {
    GTEST_SKIP() << "the host has no account without a shell that is known here";
  }
  EXPECT_EQ(Check(1, "daemon"), 2);
  EXPECT_EQ(name_, "before");
}

TEST_F(HostPasswords, FailureOfPamIsLogged) {
  EXPECT_EQ(Check(-5, "root"), -1);
  EXPECT_EQ(name_, "before");
  EXPECT_EQ(SyslogCapture::Count("PAM cannot check a password [-5]"), 1);
}

TEST_F(HostPasswords, ModuleThatOthersMayWriteCannotCheck) {
  ASSERT_EQ(chmod(Module().c_str(), 0757), 0);
  EXPECT_EQ(Check(1, "root"), -1);
  EXPECT_EQ(SyslogCapture::Count("refused to load " + Module()), 1);
}

/// The module with a PAM service of the test's own, so that the host's is not asked.
class PamModule : public testing::Test {
 protected:
  void SetUp() override {
    const std::string path = std::string(kBuiltModuleDir) + "/" + kPasswordPamModule;
    if (!std::filesystem::exists(path)) {
      GTEST_SKIP() << "built without PAM";
    }
    void* module = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(module, nullptr) << dlerror();
    check_ = reinterpret_cast<PasswordPamCheck>(dlsym(module, kPasswordPamCheck));
    ASSERT_NE(check_, nullptr);
    std::string pattern = (std::filesystem::temp_directory_path() / "pam-XXXXXX").string();
    ASSERT_NE(mkdtemp(pattern.data()), nullptr);
    dir_ = pattern;
  }
  void TearDown() override {
    if (!dir_.empty()) {
      std::filesystem::remove_all(dir_);
    }
  }

  void Service(const std::string& text) { std::ofstream(dir_ + "/webapi") << text; }

  /// A service whose authentication is a script that reads the password.
  void ServiceByScript(const std::string& account) {
    const std::string script = dir_ + "/check";
    std::ofstream(script) << "#!/bin/sh\n[ \"$PAM_USER/$(tr -d '\\0')\" = anna/secret ]\n";
    ASSERT_EQ(chmod(script.c_str(), 0700), 0);
    // pam_exec's own failure is a system error, so it only decides which line comes next.
    Service("auth [success=1 default=ignore] pam_exec.so expose_authtok quiet " + script +
            "\nauth requisite pam_deny.so\nauth required pam_permit.so\n" + account);
  }

  int Check(const char* account, const char* password, int size = 64) {
    user_[0] = '\0';
    return check_(dir_.c_str(), account, password, address_, user_, size);
  }

  PasswordPamCheck check_ = nullptr;
  const char* address_ = "192.0.2.7";
  std::string dir_;
  char user_[64] = "";
};

TEST_F(PamModule, PasswordReachesTheStackAndDecides) {
  ServiceByScript("account required pam_permit.so\n");
  EXPECT_EQ(Check("anna", "secret"), 1);
  EXPECT_STREQ(user_, "anna");
  EXPECT_EQ(Check("anna", "wrong"), 0);
  EXPECT_EQ(Check("anna", ""), 0);
  EXPECT_EQ(Check("otto", "secret"), 0);
  EXPECT_STREQ(user_, "");
}

TEST_F(PamModule, AccountThatIsRefusedIsRefused) {
  ServiceByScript("account required pam_deny.so\n");
  EXPECT_NE(Check("anna", "secret"), 1);
  ServiceByScript("account required pam_debug.so acct=acct_expired\n");
  EXPECT_EQ(Check("anna", "secret"), 2);
  EXPECT_EQ(Check("anna", "wrong"), 0);
  ServiceByScript("account required pam_debug.so acct=new_authtok_reqd\n");
  EXPECT_EQ(Check("anna", "secret"), 2);
}

TEST_F(PamModule, ClientsAddressIsTheRemoteHost) {
  const std::string script = dir_ + "/account";
  std::ofstream(script) << "#!/bin/sh\nprintf %s \"$PAM_RHOST\" > " << dir_ << "/host\n";
  ASSERT_EQ(chmod(script.c_str(), 0700), 0);
  const auto host = [this] {
    std::ifstream file(dir_ + "/host");
    std::string text;
    std::getline(file, text);
    return text;
  };
  ServiceByScript("account required pam_exec.so quiet " + script + "\n");
  EXPECT_EQ(Check("anna", "secret"), 1);
  EXPECT_EQ(host(), "192.0.2.7");
  address_ = "";
  EXPECT_EQ(Check("anna", "secret"), 1);
  EXPECT_EQ(host(), "");
}

TEST_F(PamModule, ServiceThatFailsCannotCheck) {
  Service("auth required pam_debug.so auth=authinfo_unavail\naccount required pam_permit.so\n");
  EXPECT_LT(Check("anna", "secret"), 0);
}

TEST_F(PamModule, UnknownUserIsRefused) {
  Service("auth required pam_debug.so auth=user_unknown\naccount required pam_permit.so\n");
  EXPECT_EQ(Check("anna", "secret"), 0);
}

TEST_F(PamModule, NameThatDoesNotFitCannotBeGiven) {
  ServiceByScript("account required pam_permit.so\n");
  EXPECT_LT(Check("anna", "secret", 4), 0);
  EXPECT_EQ(Check("anna", "secret", 5), 1);
}

TEST_F(PamModule, MissingServiceLetsNobodyIn) {
  // In a process of its own: libpam 1.5 loses memory when it finds no service.
  EXPECT_EXIT(_exit(Check("anna", "secret") == 1 ? 1 : 0), testing::ExitedWithCode(0), "");
}

}  // namespace
