#include "programs/webapi/new/New.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>

#include "programs/webapi/new/Templates.h"
#include "webapi/base/Text.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Paths.h"

namespace QELO::AuthorProgram {
namespace {

constexpr char kHelp[] =
    "webapi new DIR NAME\n"
    "    Writes a new API library into DIR, which must be empty or not there yet: description,\n"
    "    CMakeLists.txt, a method, a method that works in the background, and their tests.\n"
    "    NAME is the API's, as QELO.Photo.Album: two to five parts of letters, digits and \"_\",\n"
    "    each beginning with a letter.\n"
    "\n"
    "Exit status: 0 written; 1 it could not be; 2 wrong use.\n";

constexpr size_t kLeastParts = 2;
constexpr size_t kMostParts = 5;  // of longer names, calls look for the first five alone
constexpr size_t kLongestName = 100;
constexpr mode_t kDirectoryMode = 0777;  // the umask takes off
constexpr mode_t kFileMode = 0666;

bool isLetter(char c) {
  return IsAlphanumeric(c) && !IsDigit(c);
}

bool isPart(std::string_view part) {
  return !part.empty() && isLetter(part.front()) &&
         std::all_of(part.begin(), part.end(),
                     [](char c) { return IsAlphanumeric(c) || c == '_'; });
}

/// The last part of the name in small letters; as it ends, it is no word of C++ and nobody else's.
std::string projectOf(std::string_view last) {
  std::string project;
  for (const char c : last) {
    project += static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
  }
  return project + "_api";
}

/// What speaks against an API's name, or "".
std::string faultOf(const std::string& name, std::string& project) {
  std::string_view rest = name;
  std::string_view last;
  size_t parts = 0;
  bool isGood = name.size() <= kLongestName && !name.ends_with('.');
  while (!rest.empty() && isGood) {
    last = TakePiece(rest, ".");
    isGood = isPart(last);
    ++parts;
  }
  if (!isGood || parts < kLeastParts || parts > kMostParts) {
    return Shown(name) + " cannot be an API's name: two to five parts, as QELO.Photo.Album";
  }
  project = projectOf(last);
  const std::string file = Paths::kDescriptionDir + name + ".lib";
  return access(file.c_str(), F_OK) == 0 ? name + " is an API of this host already: " + file : "";
}

std::string filled(std::string_view text, const std::string& name, const std::string& project) {
  std::string result(text);
  for (const auto& [mark, value] :
       {std::pair<std::string_view, const std::string&>{"@NAME@", name}, {"@PROJECT@", project}}) {
    for (size_t at = 0; (at = result.find(mark, at)) != std::string::npos; at += value.size()) {
      result.replace(at, mark.size(), value);
    }
  }
  return result;
}

/// Makes the directory, or takes an empty one. @return what is wrong, or ""
std::string makeDirectory(const std::string& path) {
  if (mkdir(path.c_str(), kDirectoryMode) == 0) {
    return "";
  }
  const int error = errno;
  const std::unique_ptr<DIR, int (*)(DIR*)> directory(opendir(path.c_str()), closedir);
  if (error != EEXIST || !directory) {
    return Shown(path) + ": " + strerror(error);
  }
  while (const dirent* entry = readdir(directory.get())) {
    if (strcmp(entry->d_name, ".") != 0 && strcmp(entry->d_name, "..") != 0) {
      return Shown(path) + " is not empty; nothing is written over";
    }
  }
  return "";
}

/// Writes one file below the directory. @return what is wrong, or ""
std::string writeFile(int directory, const std::string& path, const std::string& text) {
  const size_t slash = path.find('/');
  if (slash != std::string::npos) {
    mkdirat(directory, path.substr(0, slash).c_str(), kDirectoryMode);
  }
  const UniqueFd file(
      openat(directory, path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kFileMode));
  return file && WriteText(file.Get(), text) ? "" : path + ": " + strerror(errno);
}

std::string writeAll(const std::string& path, const std::string& name, const std::string& project) {
  const std::string wrong = makeDirectory(path);
  if (!wrong.empty()) {
    return wrong;
  }
  const UniqueFd directory(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!directory) {
    return Shown(path) + ": " + strerror(errno);
  }
  for (const Template& file : Templates()) {
    const std::string fault = writeFile(directory.Get(), filled(file.path, name, project),
                                        filled(file.text, name, project));
    if (!fault.empty()) {
      return fault;
    }
  }
  return "";
}

}  // namespace

ExitCode New(const Arguments& arguments) {
  if (AsksForHelp(arguments)) {
    fputs(kHelp, stdout);
    return kDone;
  }
  std::vector<std::string> words;
  std::string wrong = ReadArguments(arguments, {}, words);
  if (wrong.empty() && (words.size() != 2 || words[0].empty())) {
    wrong = "a directory and a name are needed";
  }
  std::string project;
  if (wrong.empty()) {
    wrong = faultOf(words[1], project);
  }
  if (!wrong.empty()) {
    return WrongUse("new", wrong);
  }
  const std::string fault = writeAll(words[0], words[1], project);
  if (!fault.empty()) {
    fprintf(stderr, "webapi new: %s\n", fault.c_str());
    return kFailed;
  }
  printf(
      "%s is written. Build it, test it, install it as root, call it:\n"
      "  cmake -S %s -B %s/build\n"
      "  cmake --build %s/build --target check\n"
      "  cmake --install %s/build\n"
      "  webapi call --api %s --method greet --param name=Ann\n",
      Shown(words[0]).c_str(), Shown(words[0]).c_str(), Shown(words[0]).c_str(),
      Shown(words[0]).c_str(), Shown(words[0]).c_str(), words[1].c_str());
  return kDone;
}

}  // namespace QELO::AuthorProgram
