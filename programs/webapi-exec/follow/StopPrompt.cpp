#include "programs/webapi-exec/follow/StopPrompt.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace QELO::ExecProgram {
namespace {

constexpr char kQuestion[] = "Stop the task (s), leave it running (l), or continue watching (c)? ";
constexpr char kTerminal[] = "/dev/tty";  // standard input may be a file

}  // namespace

StopPrompt::~StopPrompt() {
  GiveKeysBack();
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
    TakeKeys();
    tcflush(terminal_, TCIFLUSH);
    fprintf(stderr, "%s", kQuestion);
  }
  return isAsking_;
}

/// Ctrl-C stays a signal, and so the program gets to give the keys back. The keys that would stop
/// or end it without that are off meanwhile.
void StopPrompt::TakeKeys() {
  if (hasKeys_ || tcgetattr(terminal_, &former_) != 0) {
    return;
  }
  termios now = former_;
  now.c_lflag &= ~static_cast<tcflag_t>(ICANON);
  now.c_cc[VMIN] = 1;
  now.c_cc[VTIME] = 0;
  now.c_cc[VQUIT] = _POSIX_VDISABLE;
  now.c_cc[VSUSP] = _POSIX_VDISABLE;
  hasKeys_ = tcsetattr(terminal_, TCSANOW, &now) == 0;
}

void StopPrompt::GiveKeysBack() {
  // In the background the terminal is the shell's, which has made it its own.
  if (hasKeys_ && tcgetpgrp(terminal_) == getpgrp()) {
    tcsetattr(terminal_, TCSANOW, &former_);
  }
  hasKeys_ = false;
}

StopPrompt::Choice StopPrompt::Read() {
  char keys[256];
  const ssize_t count = TEMP_FAILURE_RETRY(read(terminal_, keys, sizeof keys));
  if (count <= 0 || (hasKeys_ && static_cast<cc_t>(keys[0]) == former_.c_cc[VEOF])) {
    Cancel();
    return Choice::kLeave;
  }
  const Choice choice = ChoiceOf(keys[0]);
  if (keys[count - 1] != '\n') {
    fputc('\n', stderr);
  }
  if (choice == Choice::kNone) {
    Ask();
  } else {
    isAsking_ = false;
    GiveKeysBack();
  }
  return choice;
}

StopPrompt::Choice StopPrompt::ChoiceOf(char key) {
  switch (key) {
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
      return Choice::kNone;
  }
}

void StopPrompt::Cancel() {
  if (isAsking_) {
    fputc('\n', stderr);
    isAsking_ = false;
  }
  GiveKeysBack();
}

}  // namespace QELO::ExecProgram
