#pragma once

#include "programs/webapi/Arguments.h"

namespace QELO::AuthorProgram {

/// webapi diff: what callers of an old description meet in a new one.
ExitCode Diff(const Arguments& arguments);

}  // namespace QELO::AuthorProgram
