#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <iostream>

#include "webapi/platform/Core.h"

namespace {

/// What is left in a buffer would be written once more by the child.
void flushOutput() {
  std::cout.flush();
  fflush(nullptr);
}

void silenceStandardDescriptors() {
  const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
  for (int fd = STDIN_FILENO; fd <= STDERR_FILENO; ++fd) {
    if (null < 0) {
      close(fd);  // nobody may be kept waiting for our end
    } else if (null != fd) {
      dup2(null, fd);
    } else {
      fcntl(fd, F_SETFD, 0);
    }
  }
  if (null > STDERR_FILENO) {
    close(null);
  }
}

}  // namespace

extern "C" {

pid_t QLIBCProcFork(void) {
  flushOutput();
  const pid_t pid = fork();
  if (pid == 0) {
    silenceStandardDescriptors();
  }
  return pid;
}

pid_t QLIBCProcForkEx(int) {
  flushOutput();
  return fork();
}

}  // extern "C"
