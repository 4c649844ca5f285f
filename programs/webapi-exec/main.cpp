// Calls a web API of this host from the command line.

#include <cstdio>

#include "programs/webapi-exec/Answer.h"
#include "programs/webapi-exec/Call.h"
#include "programs/webapi-exec/Names.h"
#include "programs/webapi-exec/follow/Follow.h"

using namespace QELO::ExecProgram;

static ExitCode run(const Options& options) {
  if (options.help) {
    printf("%s", kHelp);
    return kDone;
  }
  if (options.list) {
    return listNames(options);
  }
  if (options.follow) {
    return follow(options);
  }
  Json::Value answer;
  const std::string wrong = makeCall(options, answer);
  if (!wrong.empty()) {
    if (!answer.isNull()) {  // the call was made, and nothing else tells how it ended
      showAnswer(options, answer);
    }
    fprintf(stderr, "webapi-exec: %s\n", wrong.c_str());
    return kFailed;
  }
  return options.batch.empty() ? showAnswer(options, answer) : showTable(options, answer);
}

int main(int argc, char** argv) {
  Options options;
  const std::string wrong = readOptions(argc, argv, options);
  if (!wrong.empty()) {
    fprintf(stderr, "webapi-exec: %s; see webapi-exec --help\n", wrong.c_str());
    return kWrongUse;
  }
  const ExitCode code = run(options);
  // What cannot be printed, as on a full disk, is no success.
  return fflush(stdout) == 0 && ferror(stdout) == 0 ? code : kFailed;
}
