#pragma once

#include <sched.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/types.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <locale>
#include <memory>
#include <string>
#include <vector>

#include "programs/webapi-server/worker/StreamFormats.h"
#include "webapi/base/FileIdentity.h"

namespace QELO {

/// What a process is before foreign code runs in it, to be so again afterwards. Some things a call
/// leaves can be put back; where others are left the process is of no use to another call.
///
/// Not seen is what a library keeps in its own memory: its author has said that calls may share it.
class Remains {
 public:
  enum class Left : int {
    kNothing,
    kProcess,
    kThread,
    kDescriptor,
    kDirectory,
    kPriority,
    kTimer,
    kRights,
    kLimit,
    kMemory
  };

  /// In words; null for nothing, and for what is none of them.
  static const char* TextOf(Left left);

  /// @param memory  bytes that the process may have for itself
  /// @param timers  timers of the process, which foreign code may not add to
  Remains(size_t memory, int timers) : mostMemory_(memory), timers_(timers) {}

  /// Remembers what the process is now. @return false when that cannot be told
  bool Keep();
  /// Puts back what can be. @return what was left that cannot be
  Left PutBack();

 private:
  static constexpr size_t kSignals = 65;  ///< one more than the highest signal

  struct Ids {
    uid_t user[3];
    gid_t group[3];
    std::vector<gid_t> groups;
    std::array<uint32_t, 6> capabilities{};  ///< as capget(2) gives them
    int secureBits = 0;                      ///< what root is to a program that is executed
    int noNewPrivileges = 0;
    bool operator==(const Ids& other) const;
  };
  struct Schedule {
    int nice = 0;
    int policy = 0;
    long input = 0;  ///< input and output
    cpu_set_t processors{};
  };
  static bool Read(Ids& ids);
  static bool Read(Schedule& schedule);
  bool ListDescriptors(uint64_t& open) const;
  bool HasDescriptors() const;
  bool HasSchedule();
  void PutBackSignals();
  void PutBackRest();

  const size_t mostMemory_;
  const int timers_;
  FileIdentity directory_;
  uint64_t open_ = 0;  ///< a bit a descriptor
  std::vector<FileIdentity> files_;
  mode_t umask_ = 0;
  sigset_t blocked_{};
  std::array<struct sigaction, kSignals> handlers_{};
  Ids ids_{};
  Schedule schedule_;
  std::array<rlimit, RLIM_NLIMITS> limits_{};
  std::string cLocale_;
  std::locale cppLocale_;
  std::unique_ptr<StreamFormats> streams_;
};

}  // namespace QELO
