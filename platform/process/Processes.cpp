#include <unistd.h>

#include <cstdio>
#include <iostream>

#include "webapi/base/NullDevice.h"
#include "webapi/platform/Core.h"

namespace {

/// What is left in a buffer would be written once more by the child.
void flushOutput() {
  std::cout.flush();
  fflush(nullptr);
}

}  // namespace

extern "C" {

pid_t QLIBCProcFork(void) {
  flushOutput();
  const pid_t pid = fork();
  if (pid == 0) {
    QELO::LetGoOf({STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO});
  }
  return pid;
}

pid_t QLIBCProcForkEx(int) {
  flushOutput();
  return fork();
}

}  // extern "C"
