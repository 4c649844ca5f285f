#include "platform/multipart/LastWords.h"

#include <unistd.h>

#include <array>
#include <atomic>
#include <csignal>
#include <cstring>
#include <initializer_list>
#include <new>

#include "platform/multipart/Limits.h"

namespace QELO::Platform::LastWords {
namespace {

constexpr size_t kLongestName = 64;  ///< with its NUL

/// A file. The signal may come while it is written.
struct Entry {
  std::atomic<bool> isUsed;
  int directory;
  char name[kLongestName];
};

using Table = std::array<Entry, UploadLimits::kFiles>;

/// Made by the first file and kept until the process ends. As an object of the library its pages
/// would be a cost of every call.
constinit std::atomic<Table*> table{nullptr};
/// Forked children have the table too, and leave the files alone.
constinit std::atomic<pid_t> maker{0};

void end(int signal) {
  if (const Table* entries = table.load(); entries != nullptr && getpid() == maker.load()) {
    for (const Entry& entry : *entries) {
      if (entry.isUsed.load()) {
        unlinkat(entry.directory, entry.name, 0);
      }
    }
  }
  // The handler is the signal's default again (SA_RESETHAND).
  raise(signal);
}

/// Takes the signals that would end the process, where nobody else does.
void watch() {
  for (const int signal : {SIGTERM, SIGINT, SIGHUP, SIGPIPE, SIGXCPU, SIGXFSZ, SIGSEGV, SIGBUS,
                           SIGILL, SIGFPE, SIGABRT}) {
    struct sigaction former {};
    struct sigaction ours {};
    ours.sa_handler = end;
    ours.sa_flags = static_cast<int>(SA_RESETHAND | SA_RESTART);
    if (sigaction(signal, nullptr, &former) == 0 && former.sa_handler == SIG_DFL) {
      sigaction(signal, &ours, nullptr);
    }
  }
}

}  // namespace

void Add(int directory, const std::string& name) {
  if (table.load() == nullptr) {
    table = new (std::nothrow) Table{};
  }
  if (table.load() == nullptr) {
    return;
  }
  if (maker.exchange(getpid()) != getpid()) {
    for (Entry& entry : *table) {
      entry.isUsed = false;
    }
    watch();
  }
  for (Entry& entry : *table) {
    if (!entry.isUsed.load() && name.size() < kLongestName) {
      entry.directory = directory;
      memcpy(entry.name, name.c_str(), name.size() + 1);
      entry.isUsed = true;
      return;
    }
  }
}

void Remove(int directory, const std::string& name) {
  if (table.load() == nullptr) {
    return;
  }
  for (Entry& entry : *table) {
    if (entry.isUsed.load() && entry.directory == directory && name == entry.name) {
      entry.isUsed = false;
      return;
    }
  }
}

}  // namespace QELO::Platform::LastWords
