// The CGI program: one process, one request. It stands in the description directory, where the
// library looks API descriptions up, and serves the request.

#include <unistd.h>

#include <cstdio>

#include "webapi/WebEntry.h"
#include "webapi/base/NullDevice.h"
#include "webapi/platform/Paths.h"

/// The answer is out. What API libraries print when they are unloaded is no part of it.
static void closeAnswer() {
  std::fflush(stdout);
  QELO::PutNullOver({STDOUT_FILENO});
}

int main(int argc, char** argv) {
  if (chdir(QELO::Paths::kDescriptionDir) != 0) {
    std::perror(QELO::Paths::kDescriptionDir);
    return 1;
  }
  QELO::WebEntry entry;
  entry.SetArgs(argc, argv);
  entry.Run(Json::Value());
  closeAnswer();
  return 0;
}
