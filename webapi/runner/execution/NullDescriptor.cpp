#include "webapi/runner/execution/NullDescriptor.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

#include "webapi/base/NullDevice.h"

namespace QELO {
namespace {

constexpr int kFirstOther = 3;  // the descriptors below are the standard ones

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
  identity_ = FileIdentity(former);
  return true;
}

bool NullDescriptor::GiveBack() {
  const int descriptor = std::exchange(descriptor_, -1);
  if (descriptor < 0) {
    return true;
  }
  if (former_ < 0) {
    close(descriptor);
    return true;
  }
  const int former = std::exchange(former_, -1);
  if (!identity_.IsAt(former)) {
    PutNullOver(
        {descriptor});  // foreign code may have closed that, too, and opened something there
    return false;
  }
  dup2(former, descriptor);
  close(former);
  return true;
}

void NullDescriptor::LetGo() {
  if (former_ >= 0) {
    close(former_);
    former_ = -1;
  }
}

}  // namespace QELO
