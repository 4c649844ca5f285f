#include "webapi/runner/execution/ProcessGuards.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <iostream>

namespace QELO {
namespace {

constexpr int kFirstOther = 3;  // the descriptors below are the standard ones

/// A method may have closed a C stream; the framework goes on using it.
std::FILE* revived(std::FILE* stream, int descriptor, const char* mode) {
  if (fileno(stream) < 0) {
    std::FILE* fresh = fdopen(descriptor, mode);
    return fresh != nullptr ? fresh : stream;
  }
  clearerr(stream);
  return stream;
}

}  // namespace

bool NullDescriptor::Replace(int descriptor, int null) {
  // A descriptor that was closed is the lowest free one, so that /dev/null may stand there already.
  const bool isInPlace = null == descriptor;
  const int former = isInPlace ? -1 : fcntl(descriptor, F_DUPFD_CLOEXEC, kFirstOther);
  if (!isInPlace && former < 0 && errno != EBADF) {
    return false;
  }
  const bool replaced =
      isInPlace ? fcntl(null, F_SETFD, 0) == 0 : null >= 0 && dup2(null, descriptor) == descriptor;
  if (!replaced) {
    if (former >= 0) {
      close(former);
    }
    return false;
  }
  descriptor_ = descriptor;
  former_ = former;
  return true;
}

NullDescriptor::~NullDescriptor() {
  if (descriptor_ < 0) {
    return;
  }
  if (former_ < 0) {
    close(descriptor_);
    return;
  }
  dup2(former_, descriptor_);
  close(former_);
}

void NullDescriptor::LetGo() {
  if (former_ >= 0) {
    close(former_);
    former_ = -1;
  }
}

StandardStreams* StandardStreams::innermost_ = nullptr;

StandardStreams::StandardStreams(bool shutInput, bool shutOutput) : outer_(innermost_) {
  innermost_ = this;
  const int null = shutInput || shutOutput ? open("/dev/null", O_RDWR | O_CLOEXEC) : -1;
  if (shutInput) {
    inputBuffer_ = std::cin.rdbuf();
    readAhead_.Hide();
    isShut_ = input_.Replace(STDIN_FILENO, null);
  }
  if (shutOutput) {
    std::cout.flush();
    std::fflush(stdout);
    outputBuffer_ = std::cout.rdbuf();
    isShut_ = output_.Replace(STDOUT_FILENO, null) && isShut_;
  }
  const bool isInPlace =
      (shutInput && null == STDIN_FILENO) || (shutOutput && null == STDOUT_FILENO);
  if (null >= 0 && !isInPlace) {
    close(null);
  }
}

StandardStreams::~StandardStreams() {
  innermost_ = outer_;
  if (outputBuffer_ != nullptr) {
    std::cout.flush();
    std::fflush(stdout);             // what a method left in the buffers ends in /dev/null
    std::cout.rdbuf(outputBuffer_);  // a method may have put its own in place; clears errors too
    stdout = revived(stdout, STDOUT_FILENO, "w");
  }
  if (inputBuffer_ != nullptr) {
    std::cin.rdbuf(inputBuffer_);
    stdin = revived(stdin, STDIN_FILENO, "r");
    readAhead_.GiveBack();
  }
}

void StandardStreams::LetGo() {
  for (StandardStreams* guard = innermost_; guard != nullptr; guard = guard->outer_) {
    guard->input_.LetGo();
    guard->output_.LetGo();
  }
}

Priority::~Priority() {
  if (changed_) {
    setpriority(PRIO_PROCESS, 0, former_);
  }
}

void Priority::Set(int priority) {
  former_ = getpriority(PRIO_PROCESS, 0);
  if (priority != former_) {
    setpriority(PRIO_PROCESS, 0, priority);
    changed_ = true;
  }
}

WorkingDirectory::WorkingDirectory()
    // A descriptor, since the way back by name may be barred after a change of user.
    : directory_(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)) {}

WorkingDirectory::~WorkingDirectory() {
  if (directory_ >= 0) {
    [[maybe_unused]] const int result = fchdir(directory_);
    close(directory_);
  }
}

}  // namespace QELO
