#include "programs/server/Jobs.h"

#include <signal.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <filesystem>
#include <new>
#include <string>
#include <system_error>
#include <utility>

namespace QELO {
namespace {

/// What /proc shows of a descriptor that leads to a socket.
std::string linkTo(int socket) {
  struct stat info {};
  return fstat(socket, &info) == 0 ? "socket:[" + std::to_string(info.st_ino) + "]" : "";
}

/// Whether a process has the connection to its client, but not as standard output: then a method
/// has its turn that may not write there, and nothing of the answer is out.
bool isKeptFromClient(pid_t pid, int socket) {
  const std::string wanted = linkTo(socket);
  const std::string place = "/proc/" + std::to_string(pid) + "/fd";
  bool isHeld = false;
  bool isOutput = false;
  std::error_code error;
  for (const auto& entry : std::filesystem::directory_iterator(place, error)) {
    std::error_code gone;
    if (std::filesystem::read_symlink(entry.path(), gone) == wanted) {
      isHeld = true;
      isOutput = isOutput || entry.path().filename() == "1";
    }
  }
  return !error && isHeld && !isOutput;
}

std::chrono::microseconds lengthOf(const timeval& time) {
  return std::chrono::seconds(time.tv_sec) + std::chrono::microseconds(time.tv_usec);
}

}  // namespace

void Jobs::NoteEnd::operator()(Note* note) const {
  if (isShared) {
    munmap(note, sizeof(Note));
  } else {
    delete note;
  }
}

Jobs::HeldNote Jobs::MakeNote(bool isShared) {
  if (!isShared) {
    return HeldNote(new Note{}, NoteEnd(false));
  }
  void* memory =
      mmap(nullptr, sizeof(Note), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  return HeldNote(memory == MAP_FAILED ? nullptr : new (memory) Note{}, NoteEnd());
}

void Jobs::Add(Job job) {
  if (job.note.get_deleter().isShared) {
    madvise(job.note.get(), sizeof(Note), MADV_DONTFORK);
  }
  const pid_t pid = job.pid;
  jobs_.emplace(pid, std::move(job));
}

std::optional<Jobs::Job> Jobs::TakeEnded(int& status,
                                         const std::function<void(pid_t, int)>& other) {
  rusage usage{};
  for (pid_t pid; (pid = wait4(-1, &status, WNOHANG, &usage)) > 0;) {
    const auto found = jobs_.find(pid);
    if (found != jobs_.end()) {
      Job job = std::move(found->second);
      jobs_.erase(found);
      job.processor = lengthOf(usage.ru_utime) + lengthOf(usage.ru_stime);
      return job;
    }
    other(pid, status);
  }
  return std::nullopt;
}

void Jobs::Kill(Job& job) {
  job.isKilled = true;
  kill(job.pid, SIGSTOP);  // so that nothing comes between the look and the end
  job.isSilent = isKeptFromClient(job.pid, job.connection->socket.Get());
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
