#include "programs/webapi/doctor/Doctor.h"

#include <cstdio>
#include <string>
#include <vector>

#include "programs/webapi/doctor/Diagnosis.h"

namespace QELO::AuthorProgram {
namespace {

constexpr char kHelp[] =
    "webapi doctor [OPTION...]\n"
    "    Looks at what calls need on this host: accounts, directories and files with their modes,\n"
    "    descriptions, libraries and sockets, the CGI program, the web server's configuration, "
    "and\n"
    "    syslog. A line each: \"ok: ...\", \"note: ...\", or \"wrong: ...; what to do\". Nothing "
    "is\n"
    "    changed. As root it sees all.\n"
    "    --config FILE  the web server's configuration, instead of the usual places\n"
    "    --entry FILE   the CGI program, instead of the installed one\n"
    "\n"
    "Exit status: 0 nothing is wrong; 1 something is; 2 wrong use.\n";

}  // namespace

ExitCode Doctor(const Arguments& arguments) {
  if (AsksForHelp(arguments)) {
    fputs(kHelp, stdout);
    return kDone;
  }
  std::string configuration;
  std::string entry = WEBAPI_ENTRY;
  std::vector<std::string> words;
  std::string wrong = ReadArguments(
      arguments,
      {{.name = "--config", .value = &configuration}, {.name = "--entry", .value = &entry}}, words);
  if (wrong.empty() && !words.empty()) {
    wrong = Shown(words[0]) + " is no option";
  }
  if (!wrong.empty()) {
    return WrongUse("doctor", wrong);
  }
  Diagnosis diagnosis;
  LookAtAccounts(diagnosis);
  LookAtPlaces(diagnosis);
  LookAtDescriptions(diagnosis);
  LookAtEntry(entry, diagnosis);
  LookAtWebServer(configuration, diagnosis);
  LookAtSockets(diagnosis);
  return diagnosis.Count() == 0 ? kDone : kFailed;
}

}  // namespace QELO::AuthorProgram
