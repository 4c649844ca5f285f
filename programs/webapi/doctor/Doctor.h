#pragma once

#include "programs/webapi/Arguments.h"

namespace QELO::AuthorProgram {

/// webapi doctor: whether this host can serve calls, and what to do where it cannot.
ExitCode Doctor(const Arguments& arguments);

}  // namespace QELO::AuthorProgram
