#include "webapi/runner/execution/CStream.h"

#include <unistd.h>

#include <cstring>

namespace QELO {

CStream::CStream(std::FILE*& stream, int descriptor)
    : stream_(stream),
      former_(stream),
      descriptor_(descriptor),
      wasOpen_(fileno(stream) == descriptor) {
  memcpy(state_, stream, sizeof state_);
}

void CStream::Restore() {
  stream_ = former_;
  if (!wasOpen_ || memcmp(former_, state_, sizeof state_) == 0) {
    return;
  }
  // Opening it anew is the only way to make a wide stream narrow; it takes a closed one, too.
  const char* mode = descriptor_ == STDIN_FILENO ? "r" : "w";
  if (freopen("/dev/null", mode, former_) == nullptr) {
    return;
  }
  const int opened = fileno(former_);
  if (opened != descriptor_) {  // one that was closed takes the lowest number that is free
    dup2(opened, descriptor_);
    close(opened);
    former_->_fileno = descriptor_;  // glibc's; there is no other way to move a stream
  }
}

}  // namespace QELO
