#pragma once

#include <sys/types.h>

#include <functional>
#include <memory>
#include <optional>
#include <unordered_map>

#include "programs/server/Connection.h"
#include "programs/server/Note.h"

namespace QELO {

/// The processes that serve requests at present, and what they have told.
class Jobs {
 public:
  /// Gives a note's memory back.
  struct NoteEnd {
    NoteEnd() : NoteEnd(true) {}
    explicit NoteEnd(bool shared) : isShared(shared) {}
    void operator()(Note* note) const;
    bool isShared;
  };
  using HeldNote = std::unique_ptr<Note, NoteEnd>;

  struct Job {
    pid_t pid = 0;
    std::unique_ptr<Connection> connection;
    HeldNote note;
    ServerClock::time_point started;
    ServerClock::time_point deadline;
    bool isKilled = false;
    bool isSilent = false;  ///< it was killed before it had said anything to the client
    std::chrono::microseconds processor{};  ///< that it took, once it has ended
  };

  /// A blank note; null without memory.
  /// @param isShared  the next process that is forked has the same one, and not a copy
  static HeldNote MakeNote(bool isShared);
  /// Takes up a process that has been forked. No other one has its note: what a call leaves running
  /// must not see the calls after it.
  void Add(Job job);
  size_t Count() const { return jobs_.size(); }
  /// Takes out a job whose process has ended.
  /// @param status  receives how
  /// @param other   is told of processes that serve no job
  std::optional<Job> TakeEnded(int& status, const std::function<void(pid_t, int)>& other);
  /// Kills those whose time is over, with all that they have started.
  void KillOverdue(ServerClock::time_point now);
  void KillAll();

 private:
  static void Kill(Job& job);

  std::unordered_map<pid_t, Job> jobs_;
};

}  // namespace QELO
