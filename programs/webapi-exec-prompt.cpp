#include "programs/webapi-exec-prompt.h"

#include <fcntl.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace QELO::ExecProgram {
namespace {

constexpr char kQuestion[] = "Stop the task (s), leave it running (l), or continue watching (c)? ";
constexpr char kTerminal[] = "/dev/tty";  // standard input may be a file

}  // namespace

StopPrompt::~StopPrompt() {
  if (terminal_ >= 0) {
    close(terminal_);
  }
}

bool StopPrompt::Ask() {
  if (terminal_ < 0) {
    terminal_ = open(kTerminal, O_RDONLY | O_NOCTTY | O_CLOEXEC);
  }
  isAsking_ = terminal_ >= 0;
  if (isAsking_) {
    tcflush(terminal_, TCIFLUSH);
    fprintf(stderr, "%s", kQuestion);
  }
  return isAsking_;
}

StopPrompt::Choice StopPrompt::Read() {
  char line[256];
  const ssize_t count = TEMP_FAILURE_RETRY(read(terminal_, line, sizeof line));
  if (count <= 0) {
    Cancel();
    return Choice::kLeave;
  }
  isAsking_ = false;
  switch (line[0]) {
    case 's':
    case 'S':
      return Choice::kStop;
    case 'l':
    case 'L':
      return Choice::kLeave;
    case 'c':
    case 'C':
      return Choice::kGoOn;
    default:
      Ask();
      return Choice::kNone;
  }
}

void StopPrompt::Cancel() {
  if (isAsking_) {
    fputc('\n', stderr);
    isAsking_ = false;
  }
}

}  // namespace QELO::ExecProgram
