#include "webapi/runner/execution/Priority.h"

#include <sys/resource.h>

namespace QELO {

Priority::~Priority() {
  if (changed_) {
    setpriority(PRIO_PROCESS, 0, former_);
  }
}

void Priority::Set(int priority) {
  former_ = getpriority(PRIO_PROCESS, 0);
  if (priority != former_) {
    setpriority(PRIO_PROCESS, 0, priority);
    changed_ = true;
  }
}

}  // namespace QELO
