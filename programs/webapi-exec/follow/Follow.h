#pragma once

#include "programs/webapi-exec/Options.h"

namespace QELO::ExecProgram {

/// Makes the call that the options tell, which starts a task, or takes the task that they name;
/// shows its progress until it ends, and prints its result.
/// @return kFailed when the task did not succeed; kLeft, or 128 and the number of another signal,
///         when it goes on
ExitCode follow(const Options& options);

}  // namespace QELO::ExecProgram
