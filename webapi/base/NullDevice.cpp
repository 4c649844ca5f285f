#include "webapi/base/NullDevice.h"

#include <unistd.h>

#include <algorithm>

namespace QELO {

bool PutNullOver(std::initializer_list<int> descriptors, int access) {
  const int null = open("/dev/null", access | O_CLOEXEC);
  if (null < 0) {
    return false;
  }
  for (const int descriptor : descriptors) {
    if (descriptor == null) {
      fcntl(null, F_SETFD, 0);  // it was closed, and so the lowest free one
    } else {
      dup2(null, descriptor);
    }
  }
  if (std::find(descriptors.begin(), descriptors.end(), null) == descriptors.end()) {
    close(null);
  }
  return true;
}

void LetGoOf(std::initializer_list<int> descriptors) {
  if (!PutNullOver(descriptors)) {
    std::for_each(descriptors.begin(), descriptors.end(), close);
  }
}

}  // namespace QELO
