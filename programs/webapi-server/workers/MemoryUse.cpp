#include "programs/webapi-server/workers/MemoryUse.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>

#include "webapi/base/UniqueFd.h"

namespace QELO {

size_t OwnMemory() {
  char text[128];
  const UniqueFd file(open("/proc/self/statm", O_RDONLY | O_CLOEXEC));
  const ssize_t count = file ? read(file.Get(), text, sizeof text - 1) : 0;
  text[count > 0 ? count : 0] = '\0';
  size_t all = 0;
  size_t resident = 0;
  size_t shared = 0;
  if (sscanf(text, "%zu %zu %zu", &all, &resident, &shared) != 3 || resident < shared) {
    return 0;
  }
  return (resident - shared) * static_cast<size_t>(sysconf(_SC_PAGESIZE));
}

}  // namespace QELO
