#include "webapi/base/MemoryBound.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <string_view>

#include "webapi/base/Number.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

rlimit former{};
bool isSet = false;
size_t measured = 0;  ///< by the process that this one was forked from; 0: not

/// Bytes of address space that the process has, 0 when that cannot be told.
size_t usedSpace() {
  char text[32];
  const UniqueFd file(open("/proc/self/statm", O_RDONLY | O_CLOEXEC));
  const ssize_t count = file ? read(file.Get(), text, sizeof text) : 0;
  const std::string_view start(text, static_cast<size_t>(count > 0 ? count : 0));
  size_t pages = 0;
  ParseNumber(start.substr(0, start.find(' ')), pages);
  return pages * static_cast<size_t>(sysconf(_SC_PAGESIZE));
}

}  // namespace

void MemoryBound::Set([[maybe_unused]] size_t bytes) {
#ifndef __SANITIZE_ADDRESS__
  const size_t used = isSet ? 0 : measured != 0 ? measured : usedSpace();
  if (used == 0 || getrlimit(RLIMIT_AS, &former) != 0 || former.rlim_cur <= used + bytes) {
    return;
  }
  const rlimit bound{used + bytes, former.rlim_max};
  isSet = setrlimit(RLIMIT_AS, &bound) == 0;
#else
  static_cast<void>(usedSpace);
#endif
}

void MemoryBound::Measure() {
  measured = usedSpace();
}

void MemoryBound::Lift() {
  if (isSet) {
    setrlimit(RLIMIT_AS, &former);
    isSet = false;
  }
}

}  // namespace QELO
