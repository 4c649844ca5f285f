#include "programs/entry/ServeRequest.h"

#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <exception>

#include "webapi/WebEntry.h"
#include "webapi/base/LogText.h"
#include "webapi/base/NullDevice.h"
#include "webapi/platform/Paths.h"

namespace QELO {
namespace {

/// The answer is out. What API libraries print when they are unloaded is no part of it.
void closeAnswer() {
  std::fflush(stdout);
  PutNullOver({STDOUT_FILENO});
}

void serve(WebEntry& entry, int argc, char** argv) {
  entry.SetArgs(argc, argv);
  entry.Run(Json::Value());
  closeAnswer();
}

}  // namespace

int ServeRequest(int argc, char** argv, std::unique_ptr<WebEntry> (*make)()) {
  WebEntry::GuardProcess();
  if (chdir(Paths::kDescriptionDir) != 0) {
    std::perror(Paths::kDescriptionDir);
    return 1;
  }
  try {
    if (make != nullptr) {
      serve(*make(), argc, argv);
    } else {
      WebEntry entry;
      serve(entry, argc, argv);
    }
    return 0;
  } catch (
      const std::exception& error) {  // before or after the answer, which has a guard of its own
    syslog(LOG_ERR, "%s:%d %s", "main.cpp", __LINE__, LogText(error.what()).c_str());
  } catch (...) {
    syslog(LOG_ERR, "%s:%d %s", "main.cpp", __LINE__, "an exception of no known kind");
  }
  return 1;
}

}  // namespace QELO
