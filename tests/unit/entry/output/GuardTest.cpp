// An answer that cannot be made is replaced by one that can.

#include <sys/resource.h>
#include <sys/wait.h>

#include <fstream>

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

using OutputGuard = CgiTest;

constexpr size_t kLarge = 64 << 20;
constexpr rlim_t kLeft = 16 << 20;

size_t addressSpace() {
  size_t pages = 0;
  std::ifstream("/proc/self/statm") >> pages;
  return pages * static_cast<size_t>(sysconf(_SC_PAGESIZE));
}

/// Has an answer for whose text there is no memory.
class LargeEntry : public TestEntry {
 public:
  bool Initialize(const Json::Value&) override {
    Response()->SetSuccess(Json::Value(std::string(kLarge, 'x')));
    const rlimit limit{addressSpace() + kLeft, RLIM_INFINITY};
    setrlimit(RLIMIT_AS, &limit);
    return false;
  }
};

TEST_F(OutputGuard, AnswerThereIsNoMemoryForIsNoAnswerAndLogged) {
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "needs its address space";
#endif
  fflush(nullptr);
  const pid_t child = fork();
  if (child == 0) {
    const CgiAnswer answer = Printed([] { LargeEntry().Run(Json::Value()); });
    const bool good = answer.Code() == 117 && answer.HasLine("X-Content-Type-Options: nosniff") &&
                      SyslogCapture::Count("WebEntry.cpp:") == 1;
    _exit(good ? 0 : 1);
  }
  int status = -1;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

}  // namespace
}  // namespace QELO
