#include "webapi/runner/execution/StandardStreams.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>

#include "webapi/base/Log.h"

namespace QELO {

StandardStreams* StandardStreams::innermost_ = nullptr;

StandardStreams::StandardStreams(bool shutInput, bool shutOutput)
    : shutsInput_(shutInput), shutsOutput_(shutOutput), outer_(innermost_) {
  innermost_ = this;
  if (shutsInput_) {
    readAhead_.Hide();
    cInput_.emplace(stdin, STDIN_FILENO);
  }
  if (shutsOutput_) {
    std::fflush(stdout);
    cOutput_.emplace(stdout, STDOUT_FILENO);
  }
  if (shutsInput_ || shutsOutput_) {
    Shut();
  }
}

void StandardStreams::Shut() {
  const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
  const bool inputShut = !shutsInput_ || input_.Replace(STDIN_FILENO, null);
  const bool outputShut = !shutsOutput_ || output_.Replace(STDOUT_FILENO, null);
  isShut_ = inputShut && outputShut;
  const bool isInPlace =
      (shutsInput_ && null == STDIN_FILENO) || (shutsOutput_ && null == STDOUT_FILENO);
  if (null >= 0 && !isInPlace) {
    close(null);
  }
}

StandardStreams::~StandardStreams() {
  innermost_ = outer_;
  cppStreams_.RestoreBuffers();
  if (isShut_ && cInput_) {
    cInput_->Restore();
  }
  if (isShut_ && cOutput_) {
    cOutput_->Restore();
  }
  if (!input_.GiveBack()) {
    WEBAPI_LOG("APIRunner.cpp", "standard input is lost: foreign code closed its descriptor");
  }
  if (!output_.GiveBack()) {
    WEBAPI_LOG("APIRunner.cpp",
               "standard output is lost, and the answer: foreign code closed its descriptor");
  }
  readAhead_.GiveBack();
  cppStreams_.Restore();
}

bool StandardStreams::IsOutputShut() {
  for (const StandardStreams* guard = innermost_; guard != nullptr; guard = guard->outer_) {
    if (guard->shutsOutput_) {
      return true;
    }
  }
  return false;
}

void StandardStreams::LetGo() {
  for (StandardStreams* guard = innermost_; guard != nullptr; guard = guard->outer_) {
    guard->input_.LetGo();
    guard->output_.LetGo();
  }
}

}  // namespace QELO
