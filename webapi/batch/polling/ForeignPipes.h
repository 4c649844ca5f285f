#pragma once

#include <sys/types.h>

namespace QELO {

/// Closes what leads from a background process to those who wait for its starter: the starter may
/// be a child whose answer a parent reads from a pipe until its last writer is gone. Descriptors
/// above the standard ones are closed when they are
/// - the write end of a pipe whose read end this process does not have, or
/// - an end of a socket pair that another process than the starter made.
///
/// Everything else stays, since the work may use what its method has opened: files, connections,
/// the system log, a pipe between the method and the work.
/// @param starter  the process that was forked
void closePipesToOthers(pid_t starter) noexcept;

}  // namespace QELO
