#include "programs/server/Jobs.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/wait.h>

#include <cstring>
#include <new>
#include <string>
#include <string_view>
#include <utility>

#include "webapi/base/Number.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

constexpr char kWritten[] = "wchar: ";

/// Bytes that a process has written by now; all that there could be when that is not known.
uint64_t writtenBytes(pid_t pid) {
  const std::string path = "/proc/" + std::to_string(pid) + "/io";
  const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  std::string text;
  uint64_t bytes = UINT64_MAX;
  if (file && ReadText(file.Get(), 4096, text)) {
    const size_t begin = text.find(kWritten);
    if (begin != std::string::npos) {
      const size_t value = begin + strlen(kWritten);
      ParseNumber(std::string_view(text).substr(value, text.find('\n', value) - value), bytes);
    }
  }
  return bytes;
}

}  // namespace

void Jobs::NoteEnd::operator()(Note* note) const {
  munmap(note, sizeof(Note));
}

Jobs::HeldNote Jobs::MakeNote() {
  void* memory =
      mmap(nullptr, sizeof(Note), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  return HeldNote(memory == MAP_FAILED ? nullptr : new (memory) Note{});
}

void Jobs::Add(Job job) {
  madvise(job.note.get(), sizeof(Note), MADV_DONTFORK);
  const pid_t pid = job.pid;
  jobs_.emplace(pid, std::move(job));
}

std::optional<Jobs::Job> Jobs::TakeEnded(int& status) {
  for (pid_t pid; (pid = waitpid(-1, &status, WNOHANG)) > 0;) {
    const auto found = jobs_.find(pid);
    if (found != jobs_.end()) {
      Job job = std::move(found->second);
      jobs_.erase(found);
      return job;
    }
  }
  return std::nullopt;
}

void Jobs::Kill(Job& job) {
  job.isKilled = true;
  kill(job.pid, SIGSTOP);  // so that nothing comes between the look and the end
  job.isSilent = writtenBytes(job.pid) == job.note->written;
  if (kill(-job.pid, SIGKILL) != 0) {  // it has not come so far as to lead a group
    kill(job.pid, SIGKILL);
  }
}

void Jobs::KillOverdue(ServerClock::time_point now) {
  for (auto& [pid, job] : jobs_) {
    if (!job.isKilled && job.deadline <= now) {
      Kill(job);
    }
  }
}

void Jobs::KillAll() {
  for (auto& [pid, job] : jobs_) {
    Kill(job);
  }
}

}  // namespace QELO
