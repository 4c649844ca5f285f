// A child process that runs one of these methods gives no answer: killed, ended, hung up, or one
// that is cut short or none at all. Each method loses it in another way.
//
// Tests: test_compound.py, exec_program.py

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "PluginTable.h"

static void killed(QELO::APIRequest*, QELO::APIResponse*) {
  std::raise(SIGKILL);
}

static void ended(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess();
  _exit(0);
}

static const int kDescriptors = 1024;

/// Closes all that it did not open.
static void hangsUp(QELO::APIRequest*, QELO::APIResponse* response) {
  for (int fd = 3; fd < kDescriptors; ++fd) {
    close(fd);
  }
  response->SetSuccess();
}

/// Whether a descriptor leads to where the standard output of the parent does.
static bool isStandardOutput(const struct stat& info) {
  struct stat output;
  const std::string path = "/proc/" + std::to_string(getppid()) + "/fd/1";
  return stat(path.c_str(), &output) == 0 && output.st_dev == info.st_dev &&
         output.st_ino == info.st_ino;
}

/// Writes to every pipe and socket that it did not open, but not into the web server's answer.
static void writeToAll(const std::string& bytes) {
  for (int fd = 3; fd < kDescriptors; ++fd) {
    struct stat info;
    const bool open = fstat(fd, &info) == 0 && (fcntl(fd, F_GETFL) & O_ACCMODE) != O_RDONLY;
    if (open && (S_ISFIFO(info.st_mode) || S_ISSOCK(info.st_mode)) && !isStandardOutput(info)) {
      [[maybe_unused]] const ssize_t count = write(fd, bytes.data(), bytes.size());
    }
  }
}

static std::string message(uint32_t length, const std::string& text) {
  return std::string(reinterpret_cast<const char*>(&length), sizeof length) + text;
}

static void rubbish(QELO::APIRequest*, QELO::APIResponse*) {
  writeToAll(message(12, "no JSON text"));
}

static void nothing(QELO::APIRequest*, QELO::APIResponse*) {
  writeToAll(message(0, ""));
}

static void scalar(QELO::APIRequest*, QELO::APIResponse*) {
  writeToAll(message(1, "5"));
}

/// Promises more than it writes.
static void cut(QELO::APIRequest*, QELO::APIResponse*) {
  writeToAll(message(100, "{\"result\": {}"));
  _exit(0);
}

/// Ends as the run-time library ends a process.
static void aborted(QELO::APIRequest*, QELO::APIResponse*) {
  std::abort();
}

/// Ends its parent, and lives on for "ms" milliseconds.
static void orphaned(QELO::APIRequest* request, QELO::APIResponse*) {
  kill(getppid(), SIGKILL);
  usleep(request->GetParam("ms").asUInt() * 1000);
}

#define LOSING(method) \
  { "QELO.Test.Losing", 1, #method, method }

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {LOSING(killed),   LOSING(ended),
                                         LOSING(hangsUp),  LOSING(rubbish),
                                         LOSING(nothing),  LOSING(scalar),
                                         LOSING(cut),      LOSING(aborted),
                                         LOSING(orphaned), {nullptr, 0, nullptr, nullptr}};
  return table;
}
