#pragma once

#include <sys/types.h>

namespace QELO {

/// Cuts off what leads from a background process to those who wait for its starter: the starter may
/// be a child whose answer a parent reads from a pipe until its last writer is gone. Descriptors
/// above the standard ones lead to /dev/null from now on when they are
/// - the write end of a pipe whose read end this process does not have, or
/// - an end of a socket pair that another process than the starter made.
///
/// Everything else stays, since the work may use what its method has opened: files, connections,
/// the system log, a pipe between the method and the work. A number that is cut off stays taken,
/// with its close-on-exec flag, for a stream of the method's may hold it. Where /dev/null cannot be
/// opened nothing is done.
/// @param starter  the process that was forked
void mutePipesToOthers(pid_t starter) noexcept;

}  // namespace QELO
