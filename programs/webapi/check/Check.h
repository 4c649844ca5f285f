#pragma once

#include "programs/webapi/Arguments.h"

namespace QELO::AuthorProgram {

/// webapi check: what is wrong with descriptions, a line each with its place.
ExitCode Check(const Arguments& arguments);

}  // namespace QELO::AuthorProgram
