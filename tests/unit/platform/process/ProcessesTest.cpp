#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <iostream>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

/// Runs a test in a child whose standard output is a file, so that the program's own is left alone.
class Processes : public PrivateRoot {
 protected:
  static int WithOutputFile(const std::function<int()>& body) {
    return InChild([&] {
      return std::freopen(Path("var/out").c_str(), "w", stdout) != nullptr ? body() : 99;
    });
  }

  static bool IsNull(int fd) {
    struct stat ours {};
    struct stat null {};
    return fstat(fd, &ours) == 0 && stat("/dev/null", &null) == 0 && S_ISCHR(ours.st_mode) &&
           ours.st_rdev == null.st_rdev;
  }

  static int StatusOf(pid_t child) {
    int status = 0;
    return waitpid(child, &status, 0) == child && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }
};

TEST_F(Processes, ForkGivesTheChildNullAsStandardDescriptors) {
  EXPECT_EQ(WithOutputFile([] {
              const pid_t child = QLIBCProcFork();
              if (child == 0) {
                _exit(IsNull(0) && IsNull(1) && IsNull(2) ? 5 : 6);
              }
              return StatusOf(child);
            }),
            5);
}

TEST_F(Processes, ForkLeavesTheParentsDescriptors) {
  EXPECT_EQ(WithOutputFile([] {
              const pid_t child = QLIBCProcFork();
              if (child == 0) {
                _exit(0);
              }
              StatusOf(child);
              return IsNull(1) ? 6 : 5;
            }),
            5);
}

TEST_F(Processes, ForkWithAClosedDescriptorStillGivesNull) {
  EXPECT_EQ(WithOutputFile([] {
              close(0);
              close(1);
              const pid_t child = QLIBCProcFork();
              if (child == 0) {
                _exit(IsNull(0) && IsNull(1) && IsNull(2) ? 5 : 6);
              }
              return StatusOf(child);
            }),
            5);
}

TEST_F(Processes, ForkExLeavesTheChildsDescriptors) {
  EXPECT_EQ(WithOutputFile([] {
              const pid_t child = QLIBCProcForkEx(65);
              if (child == 0) {
                _exit(IsNull(1) ? 6 : 5);
              }
              return StatusOf(child);
            }),
            5);
}

TEST_F(Processes, BufferedOutputIsWrittenOnce) {
  for (const bool plain : {true, false}) {
    EXPECT_EQ(WithOutputFile([plain] {
                std::cout.sync_with_stdio(false);
                std::cout << "stream,";
                printf("printf,");
                const pid_t child = plain ? QLIBCProcFork() : QLIBCProcForkEx(65);
                if (child == 0) {
                  std::cout.flush();
                  fflush(stdout);
                  _exit(0);
                }
                const int status = StatusOf(child);
                std::cout.flush();
                fflush(stdout);
                return status;
              }),
              0);
    EXPECT_EQ(Read("var/out"), "stream,printf,");
  }
}

}  // namespace
