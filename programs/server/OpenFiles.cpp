#include "programs/server/OpenFiles.h"

#include <fcntl.h>
#include <limits.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>

namespace QELO {
namespace {

constexpr int kFirstOther = 3;  ///< descriptor behind the standard ones

}  // namespace

void RaiseFileLimit(rlim_t needed) {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur < needed) {
    limit.rlim_cur = std::min(needed, limit.rlim_max);
    setrlimit(RLIMIT_NOFILE, &limit);
  }
}

void KeepAlone(UniqueFd& descriptor) {
  closelog();  // else its number would be another's, and still be written to
  if (descriptor.Get() != kFirstOther &&
      dup3(descriptor.Get(), kFirstOther, O_CLOEXEC) == kFirstOther) {
    descriptor.Release();
    descriptor = UniqueFd(kFirstOther);
  }
  close_range(kFirstOther + 1, UINT_MAX, 0);
}

}  // namespace QELO
