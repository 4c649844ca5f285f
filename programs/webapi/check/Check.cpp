#include "programs/webapi/check/Check.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <string>
#include <vector>

#include "programs/webapi/check/CheckAPI.h"
#include "programs/webapi/check/CheckLibrary.h"
#include "programs/webapi/check/TypeName.h"
#include "programs/webapi/check/Words.h"
#include "programs/webapi/text/DescriptionText.h"
#include "webapi/base/DescriptionFile.h"
#include "webapi/base/Number.h"

namespace QELO::AuthorProgram {
namespace {

constexpr char kHelp[] =
    "webapi check [OPTION...] FILE...\n"
    "    Checks descriptions of APIs and lib.def: names and types of all members, user classes,\n"
    "    accounts, versions and their methods, schemas, and whether the library's table has the\n"
    "    methods that are listed, and no others. The library is loaded for that, in a process of\n"
    "    its own. Each finding is a line: FILE:LINE:COLUMN: error: ...\n"
    "    --library FILE  the library to load, instead of the one that \"lib\" names\n"
    "    --no-library    load none\n"
    "    --timeout N     seconds that loading a library may take, 10 when not given\n"
    "    --no-accounts   look up no accounts: the description is for another host\n"
    "\n"
    "Exit status: 0 no errors, warnings at most; 1 errors, or a file cannot be read; 2 wrong "
    "use.\n";

constexpr int kMostSeconds = 600;  // of --timeout
constexpr std::string_view kDefaultsFile = "lib.def";
constexpr std::string_view kSuffix = ".lib";

std::string baseName(const std::string& path) {
  const size_t slash = path.rfind('/');
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

std::string directoryOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  return slash == std::string::npos ? "" : path.substr(0, slash + 1);
}

/// Whether calls of an API look into this file.
void checkFileName(const std::string& path, const std::string& api, const Json::Value& member,
                   Findings& findings) {
  const std::string own = baseName(path);
  std::vector<std::string> candidates;
  const std::string chosen = DescriptionFile(api, [&](const std::string& file) {
    candidates.push_back(file);
    return file == own || access((directoryOf(path) + file).c_str(), F_OK) == 0;
  });
  if (chosen == own) {
    return;
  }
  std::string names;
  for (const std::string& file : candidates) {
    names += (names.empty() ? "" : ", ") + Shown(file);
  }
  const bool isCandidate = std::find(candidates.begin(), candidates.end(), own) != candidates.end();
  findings.AddAtName(Findings::kError, member,
                     isCandidate ? "calls of it read " + Shown(chosen) + " beside this file"
                                 : "calls of it do not look here, but for " +
                                       (names.empty() ? "no file at all" : names));
}

/// Checks what a file holds.
void checkContent(const std::string& path, const Json::Value& root, const CheckOptions& options,
                  LibraryCheck& libraries, Findings& findings) {
  if (root.type() != Json::objectValue) {
    return findings.Add(Findings::kError, root,
                        std::string("it must be an object, not ") + NameOfType(root));
  }
  if (baseName(path) == kDefaultsFile) {
    return CheckDefaults(root, options, findings);
  }
  if (root.empty()) {
    findings.Add(Findings::kError, root, "it describes no API");
  }
  for (auto it = root.begin(); it != root.end() && !findings.IsFull(); ++it) {
    if (baseName(path).ends_with(kSuffix)) {
      checkFileName(path, it.name(), *it, findings);
    }
    const std::string tooMuch = TooMuchIn(*it);
    if (!tooMuch.empty()) {
      findings.AddAtName(Findings::kError, *it, tooMuch);
      continue;
    }
    CheckAPI(*it, options, findings);
    libraries.Check(path, it.name(), *it, findings);
  }
}

/// @return whether it has no errors
bool checkFile(const std::string& path, const CheckOptions& options, LibraryCheck& libraries) {
  DescriptionText text;
  const std::string wrong = text.ReadFile(path);
  if (!wrong.empty()) {
    printf("%s\n", wrong.c_str());
    return false;
  }
  Findings findings;
  for (const Twice& twice : text.Twices()) {
    findings.Put(Findings::kError, static_cast<ptrdiff_t>(twice.offset),
                 Quoted(twice.name) + " stands here already, and the last one counts");
  }
  checkContent(path, text.Root(), options, libraries, findings);
  for (const std::string& line : findings.Lines(path, text)) {
    printf("%s\n", line.c_str());
  }
  return findings.Errors() == 0;
}

/// @return what is wrong, or ""
std::string readOptions(const Arguments& arguments, CheckOptions& options,
                        std::vector<std::string>& files) {
  bool noLibrary = false;
  bool noAccounts = false;
  std::string timeout = std::to_string(LibraryTable::kUsualSeconds);
  const std::string wrong = ReadArguments(arguments,
                                          {{.name = "--library", .value = &options.library},
                                           {.name = "--timeout", .value = &timeout},
                                           {.name = "--no-library", .flag = &noLibrary},
                                           {.name = "--no-accounts", .flag = &noAccounts}},
                                          files);
  if (!wrong.empty() || files.empty()) {
    return wrong.empty() ? "a file is missing" : wrong;
  }
  if (!ParseNumber(timeout, options.seconds) || options.seconds < 1 ||
      options.seconds > kMostSeconds) {
    return "--timeout takes a number from 1 to " + std::to_string(kMostSeconds);
  }
  options.hasLibraries = !noLibrary;
  options.hasAccounts = !noAccounts;
  return noLibrary && !options.library.empty() ? "--library and --no-library exclude each other"
                                               : "";
}

}  // namespace

ExitCode Check(const Arguments& arguments) {
  if (AsksForHelp(arguments)) {
    fputs(kHelp, stdout);
    return kDone;
  }
  CheckOptions options;
  std::vector<std::string> files;
  const std::string wrong = readOptions(arguments, options, files);
  if (!wrong.empty()) {
    return WrongUse("check", wrong);
  }
  LibraryCheck libraries(options);
  bool isGood = true;
  for (const std::string& file : files) {
    isGood = checkFile(file, options, libraries) && isGood;
  }
  return isGood ? kDone : kFailed;
}

}  // namespace QELO::AuthorProgram
