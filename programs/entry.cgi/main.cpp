// The CGI program: one process, one request. It stands in the description directory, where the
// library looks API descriptions up, and serves the request.

#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <exception>

#include "webapi/WebEntry.h"
#include "webapi/base/LogText.h"
#include "webapi/base/NullDevice.h"
#include "webapi/platform/Paths.h"

/// The answer is out. What API libraries print when they are unloaded is no part of it.
static void closeAnswer() {
  std::fflush(stdout);
  QELO::PutNullOver({STDOUT_FILENO});
}

static void serve(int argc, char** argv) {
  QELO::WebEntry entry;
  entry.SetArgs(argc, argv);
  entry.Run(Json::Value());
  closeAnswer();
}

int main(int argc, char** argv) {
  QELO::WebEntry::GuardProcess();
  if (chdir(QELO::Paths::kDescriptionDir) != 0) {
    std::perror(QELO::Paths::kDescriptionDir);
    return 1;
  }
  try {
    serve(argc, argv);
    return 0;
  } catch (
      const std::exception& error) {  // before or after the answer, which has a guard of its own
    syslog(LOG_ERR, "%s:%d %s", "main.cpp", __LINE__, QELO::LogText(error.what()).c_str());
  } catch (...) {
    syslog(LOG_ERR, "%s:%d %s", "main.cpp", __LINE__, "an exception of no known kind");
  }
  return 1;
}
