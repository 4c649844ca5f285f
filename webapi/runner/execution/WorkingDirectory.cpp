#include "webapi/runner/execution/WorkingDirectory.h"

#include <fcntl.h>
#include <unistd.h>

#include "webapi/base/Log.h"

namespace QELO {

WorkingDirectory::WorkingDirectory()
    // A descriptor, since the way back by name may be barred after a change of user.
    : directory_(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)), identity_(directory_) {}

WorkingDirectory::~WorkingDirectory() {
  if (directory_ < 0) {
    return;
  }
  if (!identity_.IsAt(directory_)) {  // closed by foreign code, and maybe something else by now
    WEBAPI_LOG("APIRunner.cpp",
               "cannot go back to the working directory: foreign code closed its descriptor");
    return;
  }
  if (fchdir(directory_) != 0) {
    WEBAPI_LOG("APIRunner.cpp", "cannot go back to the working directory [%m]");
  }
  close(directory_);
}

}  // namespace QELO
