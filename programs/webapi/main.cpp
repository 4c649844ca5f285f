// For authors of API libraries and administrators: checks descriptions, and what goes with them.

#include <cstdio>
#include <string_view>

#include "programs/webapi-exec/Program.h"
#include "programs/webapi/Arguments.h"
#include "programs/webapi/check/Check.h"
#include "programs/webapi/diff/Diff.h"
#include "programs/webapi/doctor/Doctor.h"
#include "programs/webapi/new/New.h"

using namespace QELO::AuthorProgram;

namespace {

constexpr char kHelp[] =
    "webapi COMMAND [ARGUMENT...]\n"
    "    call    calls an API of this host; webapi-exec is another name of it\n"
    "    check   checks descriptions of APIs, and that their libraries have what they list\n"
    "    diff    tells what callers of an old description meet in a new one\n"
    "    doctor  tells what calls need on this host and lack\n"
    "    new     writes a new API library, with tests\n"
    "webapi COMMAND --help\n"
    "    tells more of a command.\n";

struct Command {
  std::string_view name;
  ExitCode (*run)(const Arguments& arguments);
};

constexpr Command kCommands[] = {
    {"check", Check},
    {"diff", Diff},
    {"doctor", Doctor},
    {"new", New},
};

/// webapi call: the words as they are, since it has options of its own.
int call(int argc, char** argv) {
  char name[] = "webapi call";
  argv[0] = name;
  QELO::ExecProgram::programName = name;
  return QELO::ExecProgram::run(argc, argv);
}

ExitCode run(const Arguments& words) {
  if (words.empty()) {
    fprintf(stderr, "webapi: a command is missing; see webapi --help\n");
    return kWrongUse;
  }
  if (words[0] == "--help" || words[0] == "-h" || words[0] == "help") {
    fputs(kHelp, stdout);
    return kDone;
  }
  for (const Command& command : kCommands) {
    if (command.name == words[0]) {
      return command.run({words.begin() + 1, words.end()});
    }
  }
  fprintf(stderr, "webapi: there is no command %s; see webapi --help\n", Shown(words[0]).c_str());
  return kWrongUse;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc > 1 && std::string_view(argv[1]) == "call") {
    return call(argc - 1, argv + 1);
  }
  const ExitCode code = run({argv + (argc > 0 ? 1 : 0), argv + argc});
  // What cannot be printed, as on a full disk, is no success.
  return fflush(stdout) == 0 && ferror(stdout) == 0 ? code : kFailed;
}
