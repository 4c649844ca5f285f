#include "programs/webapi/check/LibraryTable.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <grp.h>
#include <json/json.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstring>

#include "programs/webapi/Arguments.h"
#include "webapi/APITable.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::AuthorProgram {
namespace {

using JsonHelper::member;

constexpr uid_t kNobody = 65534;              // account and group that own nothing
constexpr size_t kLongestReport = 4U << 20U;  // bytes
constexpr rlim_t kMostMemory = 1U << 30U;     // bytes
constexpr rlim_t kMostFiles = 256;            // open at once
constexpr size_t kLongestName = 256;          // bytes of an API's or a method's

void limit(__rlimit_resource what, rlim_t most) {
  const rlimit bounds{most, most};
  setrlimit(what, &bounds);
}

/// What the library's own code, which runs when it is loaded, can do here: not much.
bool confine(int seconds) {
  const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
  for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    dup2(null, stream);
  }
  limit(RLIMIT_CPU, static_cast<rlim_t>(seconds));
  limit(RLIMIT_DATA, kMostMemory);
  limit(RLIMIT_FSIZE, kLongestReport);
  limit(RLIMIT_CORE, 0);
  limit(RLIMIT_NOFILE, kMostFiles);
  const bool isRoot = geteuid() == 0;
  const bool isGood =
      !isRoot || (setgroups(0, nullptr) == 0 && setresgid(kNobody, kNobody, kNobody) == 0 &&
                  setresuid(kNobody, kNobody, kNobody) == 0);
  prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
  prctl(PR_SET_DUMPABLE, 1, 0, 0, 0);  // or what is open could not be named
  return isGood;
}

std::string nameOf(const char* text) {
  return text == nullptr ? "" : std::string(text, strnlen(text, kLongestName));
}

/// The table of a loaded library as a list of lists, or what is wrong as a text.
Json::Value entriesOf(void* library) {
  using Function = _tag_API_TABLE* (*)();
  const auto function = reinterpret_cast<Function>(dlsym(library, "GetAPITable"));
  if (function == nullptr) {
    return "it has no function GetAPITable (extern \"C\" forgotten?)";
  }
  const _tag_API_TABLE* entry = function();
  if (entry == nullptr) {
    return "GetAPITable gives no table";
  }
  Json::Value entries(Json::arrayValue);
  for (; entry->api != nullptr; ++entry) {
    if (entries.size() == LibraryTable::kMostEntries) {
      return "its table has no end: an entry without an API's name";
    }
    Json::Value line(Json::arrayValue);
    line.append(nameOf(entry->api));
    line.append(entry->version);
    line.append(nameOf(entry->method));
    line.append(entry->function != nullptr);
    entries.append(line);
  }
  return entries;
}

/// The loader's words, without the path, which stands before them anyway.
std::string whyNotLoaded(const std::string& name) {
  const char* error = dlerror();
  std::string reason = error != nullptr ? error : "nobody knows why";
  if (reason.rfind(name + ": ", 0) == 0) {
    reason.erase(0, name.size() + 2);
  }
  return "it cannot be loaded: " + reason;
}

/// The child's whole work.
[[noreturn]] void report(const std::string& path, int seconds, int file, int pipe) {
  Json::Value told;
  if (!confine(seconds)) {
    told = "the rights to load it without could not be taken";
  } else {
    // Where others may not look, as in a builder's home directory, what is open still has a name.
    const bool isHidden = file >= 0 && access(path.c_str(), R_OK) != 0;
    const std::string name = isHidden ? "/proc/self/fd/" + std::to_string(file) : path;
    void* library = dlopen(name.c_str(), RTLD_NOW);
    told = library != nullptr ? entriesOf(library) : Json::Value(whyNotLoaded(name));
  }
  WriteText(pipe, JsonHelper::toString(told));
  _exit(0);
}

/// Reads what a process writes until it is done or its time is over.
/// @return whether it was done in time
bool listen(int pipe, int seconds, std::string& text) {
  using Clock = std::chrono::steady_clock;
  const auto end = Clock::now() + std::chrono::seconds(seconds);
  char buffer[4096];
  while (text.size() < kLongestReport) {
    const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now());
    pollfd waiting{pipe, POLLIN, 0};
    if (left.count() <= 0 ||
        TEMP_FAILURE_RETRY(poll(&waiting, 1, static_cast<int>(left.count()))) <= 0) {
      return false;
    }
    const ssize_t count = TEMP_FAILURE_RETRY(read(pipe, buffer, sizeof buffer));
    if (count <= 0) {
      return count == 0;
    }
    text.append(buffer, static_cast<size_t>(count));
  }
  return true;
}

/// What the child told, or how it ended instead.
std::string outcome(bool isInTime, int seconds, int status, const std::string& text,
                    Json::Value& told) {
  if (!isInTime) {
    return "it was not loaded within " + std::to_string(seconds) +
           (seconds == 1 ? " second" : " seconds");
  }
  if (WIFSIGNALED(status)) {
    return std::string("loading it ended the process: ") + strsignal(WTERMSIG(status));
  }
  if (!JsonHelper::fromString(text, told)) {
    return "loading it ended the process";
  }
  return told.isString() ? Shown(told.asString()) : "";
}

}  // namespace

std::string LibraryTable::Read(const std::string& path, int seconds) {
  entries_.clear();
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    return strerror(errno);
  }
  const UniqueFd reading(ends[0]);
  UniqueFd writing(ends[1]);
  UniqueFd file;
  struct stat info {};
  OpenRegularFile(AT_FDCWD, path.c_str(), file, info, 0);
  fflush(nullptr);  // a library that calls exit() would print it once more
  const pid_t child = fork();
  if (child < 0) {
    return strerror(errno);
  }
  if (child == 0) {
    setpgid(0, 0);
    report(path, seconds, file.Get(), writing.Get());
  }
  setpgid(child, child);
  writing = UniqueFd();
  std::string text;
  const bool isInTime = listen(reading.Get(), seconds, text);
  if (!isInTime || text.size() >= kLongestReport) {
    kill(-child, SIGKILL);
  }
  int status = 0;
  TEMP_FAILURE_RETRY(waitpid(child, &status, 0));
  kill(-child, SIGKILL);  // what it has started
  Json::Value told;
  const std::string wrong = outcome(isInTime, seconds, status, text, told);
  for (Json::ArrayIndex i = 0; wrong.empty() && told.isArray() && i < told.size(); ++i) {
    const Json::Value& line = told[i];
    if (line.isArray() && line.size() == 4 && JsonHelper::asBool(line[3])) {
      entries_.push_back({JsonHelper::asString(line[0]), JsonHelper::asInt(line[1]),
                          JsonHelper::asString(line[2])});
    }
  }
  return wrong;
}

bool LibraryTable::Has(const std::string& api, int version, const std::string& method) const {
  return std::any_of(entries_.begin(), entries_.end(), [&](const Entry& entry) {
    return entry.version == version && entry.method == method && entry.api == api;
  });
}

}  // namespace QELO::AuthorProgram
