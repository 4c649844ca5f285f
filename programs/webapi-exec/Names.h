#pragma once

#include "programs/webapi-exec/Options.h"

namespace QELO::ExecProgram {

/// Prints the names of the APIs, or of an API's methods, one a line in order.
/// @return kFailed, with a message, when there is no such API or version
ExitCode listNames(const Options& options);

}  // namespace QELO::ExecProgram
