#include "programs/server/SignalQueue.h"

#include <sys/signalfd.h>
#include <unistd.h>

namespace QELO {
namespace {

constexpr int kTaken[] = {SIGTERM, SIGINT, SIGHUP, SIGCHLD};

}  // namespace

bool SignalQueue::Open() {
  sigset_t taken;
  sigemptyset(&taken);
  for (const int number : kTaken) {
    sigaddset(&taken, number);
    signal(number, SIG_DFL);  // one that was ignored would never come
  }
  signal(SIGPIPE, SIG_IGN);
  queue_ = UniqueFd(signalfd(-1, &taken, SFD_CLOEXEC | SFD_NONBLOCK));
  return queue_ && sigprocmask(SIG_SETMASK, &taken, nullptr) == 0;
}

int SignalQueue::Take() {
  signalfd_siginfo info{};
  return read(queue_.Get(), &info, sizeof info) == sizeof info ? static_cast<int>(info.ssi_signo)
                                                               : 0;
}

void SignalQueue::Reset() {
  signal(SIGPIPE, SIG_DFL);
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
}

}  // namespace QELO
