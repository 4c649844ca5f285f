#include "tests/unit/platform/PrivateRoot.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>

#include "platform/base/Paths.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/BuiltModules.h"

namespace fs = std::filesystem;

namespace {

int run(const std::string& command) {
  return system(command.c_str());
}

/// Also when a test took the rights to its directories away from us.
void removeRoot() {
  const std::string root = QELO::Paths::kRootPrefix;
  std::error_code error;
  fs::remove_all(root, error);
  if (error) {
    run("chmod -R u+rwX '" + root + "'");
    fs::remove_all(root);
  }
}

/// A root as the script makes it, made once; every test has a copy.
const std::string& pristineRoot() {
  static const std::string kPristine = [] {
    const std::string root = std::string(QELO::Paths::kRootPrefix) + ".pristine";
    fs::remove_all(root);
    EXPECT_EQ(run(std::string(PRIVATE_ROOT_SCRIPT) + " '" + root + "' > /dev/null"), 0);
    fs::create_directory(root + "/modules");
    for (const char* module :
         {"ciphers.so", "password_crypt.so", "relay.so", "sharing.so", "tokens.so"}) {
      fs::copy_file(fs::path(kBuiltModuleDir) / module, fs::path(root) / "modules" / module);
    }
    return root;
  }();
  return kPristine;
}

}  // namespace

void PrivateRoot::SetUp() {
  removeRoot();
  ASSERT_EQ(run("cp -a '" + pristineRoot() + "' '" + QELO::Paths::kRootPrefix + "'"), 0);
  for (const char* name : {"HTTP_COOKIE", "HTTP_X_QELO_TOKEN", "HTTP_X_REAL_IP",
                           "HTTP_X_FORWARDED_FOR", "HTTP_X_QELO_RELAY", "HTTP_X_QELO_ACCESS_TOKEN",
                           "QELO_WEBAPI_USERNAME", "qeloAccessToken"}) {
    unsetenv(name);
  }
  setenv("REMOTE_ADDR", kAddress, 1);
  SyslogCapture::Clear();
}

std::string PrivateRoot::Path(const std::string& relative) {
  return std::string(QELO::Paths::kRootPrefix) + "/" + relative;
}

std::string PrivateRoot::Read(const std::string& relative) {
  std::ifstream file(Path(relative));
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

void PrivateRoot::Write(const std::string& relative, const std::string& text, mode_t mode) {
  std::ofstream(Path(relative)) << text;
  ASSERT_EQ(chmod(Path(relative).c_str(), mode), 0);
}

void PrivateRoot::Set(const std::map<std::string, std::string>& settings) {
  std::string text;
  for (const auto& [key, value] : settings) {
    text += key + "=\"" + value + "\"\n";
  }
  // As an administrator's editor does: another file takes the place of the old one.
  Write("etc/qeloinfo.new", text);
  fs::rename(Path("etc/qeloinfo.new"), Path("etc/qeloinfo.conf"));
}

namespace {

/// The lines of a file of accounts, that of one account replaced.
std::string withLine(const std::string& text, const std::string& account, const std::string& line) {
  std::istringstream lines(text);
  std::string result;
  for (std::string each; std::getline(lines, each);) {
    const bool isIt = each.starts_with(account + ":");
    result += isIt ? line : each;
    result += isIt && line.empty() ? "" : "\n";
  }
  return result;
}

}  // namespace

void PrivateRoot::SetShadow(const std::string& account, const std::string& fields) {
  Write("etc/shadow.new",
        withLine(Read("etc/shadow"), account, fields.empty() ? "" : account + ":" + fields));
  fs::rename(Path("etc/shadow.new"), Path("etc/shadow"));
}

void PrivateRoot::SetAccount(const std::string& account, const std::string& line) {
  Write("etc/passwd.new", withLine(Read("etc/passwd"), account, line), 0644);
  fs::rename(Path("etc/passwd.new"), Path("etc/passwd"));
}

long PrivateRoot::Today() {
  return time(nullptr) / 86400;
}

void PrivateRoot::Age(const std::string& relative, long seconds) {
  const timespec when{time(nullptr) - seconds, 0};
  const timespec times[2] = {when, when};
  ASSERT_EQ(utimensat(AT_FDCWD, Path(relative).c_str(), times, 0), 0);
}

struct stat PrivateRoot::Status(const std::string& relative) {
  struct stat info {};
  EXPECT_EQ(lstat(Path(relative).c_str(), &info), 0) << relative;
  return info;
}

int PrivateRoot::CountFiles(const std::string& relative) {
  int count = 0;
  for (const auto& entry : fs::directory_iterator(Path(relative))) {
    count += entry.path().filename().string()[0] != '.' ? 1 : 0;
  }
  return count;
}

bool PrivateRoot::IsRoot() {
  return geteuid() == 0;
}

int PrivateRoot::InChild(const std::function<int()>& body) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(body());
  }
  int status = 0;
  return waitpid(child, &status, 0) == child && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}
