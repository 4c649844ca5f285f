#include "webapi/runner/ProcessGuards.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <iostream>

namespace QELO {
namespace {

constexpr char kNull[] = "/dev/null";

/// Puts /dev/null in a descriptor's place. @return the former one, or -1
int replaceByNull(int descriptor, int flags) {
  const int former = fcntl(descriptor, F_DUPFD_CLOEXEC, 3);
  const int null = open(kNull, flags | O_CLOEXEC);
  if (null >= 0) {
    dup2(null, descriptor);
    close(null);
  }
  return former;
}

void restoreDescriptor(int descriptor, int former) {
  if (former < 0) {
    close(descriptor);  // it was closed before
    return;
  }
  dup2(former, descriptor);
  close(former);
}

}  // namespace

StandardStreams* StandardStreams::innermost_ = nullptr;

StandardStreams::StandardStreams(bool shutInput, bool shutOutput) : outer_(innermost_) {
  innermost_ = this;
  if (shutInput) {
    ShutInput();
  }
  if (shutOutput) {
    ShutOutput();
  }
}

StandardStreams::~StandardStreams() {
  innermost_ = outer_;
  if (inputBuffer_ != nullptr) {
    GiveBackInput();
  }
  if (outputBuffer_ != nullptr) {
    GiveBackOutput();
  }
}

void StandardStreams::LetGo() {
  for (StandardStreams* guard = innermost_; guard != nullptr; guard = guard->outer_) {
    for (int* descriptor : {&guard->inputDescriptor_, &guard->outputDescriptor_}) {
      if (*descriptor >= 0) {
        close(*descriptor);
        *descriptor = -1;
      }
    }
  }
}

void StandardStreams::ShutInput() {
  inputBuffer_ = std::cin.rdbuf(&null_);
  // A stream of its own: the former one may hold input that was read ahead.
  inputFile_ = stdin;
  std::FILE* null = std::fopen(kNull, "re");
  stdin = null != nullptr ? null : inputFile_;
  inputDescriptor_ = replaceByNull(STDIN_FILENO, O_RDONLY);
}

void StandardStreams::GiveBackInput() {
  if (stdin != inputFile_) {
    std::fclose(stdin);
    stdin = inputFile_;
  }
  restoreDescriptor(STDIN_FILENO, inputDescriptor_);
  std::cin.rdbuf(inputBuffer_);
}

void StandardStreams::ShutOutput() {
  std::cout.flush();
  std::fflush(stdout);
  outputBuffer_ = std::cout.rdbuf(&null_);
  outputDescriptor_ = replaceByNull(STDOUT_FILENO, O_WRONLY | O_TRUNC);
}

void StandardStreams::GiveBackOutput() {
  std::cout.flush();
  std::fflush(stdout);
  restoreDescriptor(STDOUT_FILENO, outputDescriptor_);
  std::cout.rdbuf(outputBuffer_);
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
