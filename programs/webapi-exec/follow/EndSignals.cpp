#include "programs/webapi-exec/follow/EndSignals.h"

#include <signal.h>

namespace QELO::ExecProgram::EndSignals {
namespace {

constexpr int kEnding[] = {SIGTERM, SIGHUP};

volatile sig_atomic_t caught = 0;

void keep(int signal) {
  caught = signal;
}

void ignoreNothing(int) {}

void handle(int signal, void (*handler)(int), int flags) {
  struct sigaction former {};
  if (sigaction(signal, nullptr, &former) != 0 || former.sa_handler == SIG_IGN) {
    return;
  }
  struct sigaction action {};
  action.sa_handler = handler;
  action.sa_flags = flags;
  sigaction(signal, &action, nullptr);
}

}  // namespace

void keepFirst() {
  handle(SIGINT, keep, SA_RESTART | static_cast<int>(SA_RESETHAND));
}

void keepAll() {
  handle(SIGINT, keep, SA_RESTART);
  for (const int signal : kEnding) {
    handle(signal, keep, SA_RESTART);
  }
  handle(SIGWINCH, ignoreNothing, SA_RESTART);
}

void leaveToParent() {
  signal(SIGINT, SIG_IGN);
  for (const int number : kEnding) {
    signal(number, SIG_DFL);
  }
}

int take() {
  const int signal = caught;
  caught = 0;
  return signal;
}

}  // namespace QELO::ExecProgram::EndSignals
