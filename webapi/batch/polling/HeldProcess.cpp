#include "webapi/batch/polling/HeldProcess.h"

#include <errno.h>
#include <signal.h>
#include <unistd.h>

extern "C" {  // the C library's header does not say so itself
#include <sys/pidfd.h>
}

namespace QELO {

HeldProcess::HeldProcess(pid_t pid) : pid_(pid), handle_(pidfd_open(pid, 0)), error_(errno) {}

HeldProcess::~HeldProcess() {
  if (handle_ >= 0) {
    close(handle_);
  }
}

int HeldProcess::Terminate() const {
  if (handle_ < 0 && error_ == ESRCH) {
    return ESRCH;
  }
  if (handle_ >= 0 && pidfd_send_signal(handle_, SIGTERM, nullptr, 0) == 0) {
    return 0;
  }
  const bool isRefused = handle_ >= 0 && errno != ENOSYS;
  return isRefused || kill(pid_, SIGTERM) != 0 ? errno : 0;
}

}  // namespace QELO
