#include "webapi/entry/ProcessGuard.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <functional>
#include <string>

#include "tests/support/FakePlatform.h"

namespace QELO {
namespace {

/// Runs in a child, whose environment and descriptors are its own. @return whether it said yes
bool inChild(const std::function<bool()>& body) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(body() ? 0 : 1);
  }
  int status = 0;
  return waitpid(child, &status, 0) == child && status == 0;
}

/// The value of a variable after the environment was cleaned; "-" when it is gone.
bool becomes(const char* name, const char* before, const std::string& after) {
  return inChild([&] {
    setenv(name, before, 1);
    CleanEnvironment();
    const char* value = getenv(name);
    return after == (value != nullptr ? value : "-");
  });
}

TEST(ProcessGuard, ClosesAllButTheStandardDescriptors) {
  EXPECT_TRUE(inChild([] {
    const int low = open("/dev/null", O_RDONLY);
    const int high = fcntl(low, F_DUPFD, 900);
    CloseInheritedDescriptors();
    return low > 2 && high >= 900 && fcntl(low, F_GETFD) < 0 && fcntl(high, F_GETFD) < 0 &&
           fcntl(2, F_GETFD) >= 0;
  }));
}

TEST(ProcessGuard, KeepsWhatTheLibraryAndCgiProgramsRead) {
  FakePlatform::Reset();
  for (const char* name :
       {"AUTH_TYPE", "CONTENT_LENGTH", "REQUEST_URI", "SERVER_SOFTWARE", "HTTP_COOKIE", "HTTPS",
        "HTTP_X_ANY", "HOST", "LC_TIME", "LANG", "QELO_REMOTE_IP", "REWRITE_APP", "TZ", "USERNAME",
        "full_task_id", "in_qeloapid", "qeloAccessToken", "task_id", "task_user"}) {
    EXPECT_TRUE(becomes(name, "x", "x")) << name;
  }
}

TEST(ProcessGuard, DropsAllElse) {
  FakePlatform::Reset();
  for (const char* name : {"HTTP_PROXY", "http_proxy", "LD_PRELOAD", "HOME", "HTTP", "TASK_ID",
                           "REQUEST_METHODS", "REQUEST_METHO", "BASH_FUNC_x%%", "Z"}) {
    EXPECT_TRUE(becomes(name, "x", "-")) << name;
  }
  EXPECT_TRUE(inChild([] {
    char broken[] = "without-a-value";
    putenv(broken);
    environ[0] = broken;
    CleanEnvironment();
    return environ[0] == nullptr || strcmp(environ[0], "without-a-value") != 0;
  }));
}

TEST(ProcessGuard, KeepsWhatASettingNames) {
  FakePlatform::Reset().keptVariable = "SITE";
  EXPECT_TRUE(becomes("SITE", "x", "x"));
  EXPECT_TRUE(becomes("SITES", "x", "-"));
}

TEST(ProcessGuard, FixesThePath) {
  FakePlatform::Reset();
  const std::string fixed = "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin";
  EXPECT_TRUE(becomes("PATH", "/tmp", fixed));
  EXPECT_TRUE(inChild([&] {
    clearenv();
    CleanEnvironment();
    return getenv("PATH") == fixed;
  }));
}

}  // namespace
}  // namespace QELO
