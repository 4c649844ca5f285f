#include "programs/webapi-exec/Program.h"

#include <cstdio>
#include <string>

#include "programs/webapi-exec/Answer.h"
#include "programs/webapi-exec/Call.h"
#include "programs/webapi-exec/Names.h"
#include "programs/webapi-exec/follow/Follow.h"

namespace QELO::ExecProgram {
namespace {

void printHelp() {
  constexpr std::string_view kName = "webapi-exec ";
  std::string text = kHelp;
  for (size_t at = 0; (at = text.find(kName, at)) != std::string::npos;) {
    const std::string_view name = programName;
    text.replace(at, kName.size() - 1, name);
    at += name.size();
  }
  printf("%s", text.c_str());
}

ExitCode run(const Options& options) {
  if (options.help) {
    printHelp();
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
    fprintf(stderr, "%s: %s\n", programName, wrong.c_str());
    return kFailed;
  }
  return options.batch.empty() ? showAnswer(options, answer) : showTable(options, answer);
}

}  // namespace

ExitCode run(int argc, char** argv) {
  Options options;
  const std::string wrong = readOptions(argc, argv, options);
  if (!wrong.empty()) {
    fprintf(stderr, "%s: %s; see %s --help\n", programName, wrong.c_str(), programName);
    return kWrongUse;
  }
  const ExitCode code = run(options);
  // What cannot be printed, as on a full disk, is no success.
  return fflush(stdout) == 0 && ferror(stdout) == 0 ? code : kFailed;
}

}  // namespace QELO::ExecProgram
