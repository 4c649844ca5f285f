#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>

/// Processes as task records know them. A number alone is given to another process one day, so a
/// record keeps the start time too, and the boot that both belong to.
namespace QELO::Platform {

struct ProcessIdentity {
  pid_t pid = 0;       ///< 0: none recorded
  uint64_t start = 0;  ///< clock ticks after the boot
  std::string boot;    ///< the kernel's boot id
};

enum class ProcessState {
  kRunning,
  kGone,    ///< it ended, or its number belongs to another process now
  kUnknown  ///< there is such a process, but who it is cannot be read
};

/// Changes with every start of the machine. @return "" when it cannot be read
std::string readBootId();

/// Milliseconds after some point of this boot; setting the clock does not change it.
int64_t bootMilliseconds();

/// @return false when there is no such process or it has ended
bool identifyProcess(pid_t pid, ProcessIdentity& identity);

/// The boot is not looked at.
ProcessState findProcess(const ProcessIdentity& identity);

/// Whether one of the process's user ids is this one; root may have any.
bool processBelongsTo(pid_t pid, uid_t user);

}  // namespace QELO::Platform
