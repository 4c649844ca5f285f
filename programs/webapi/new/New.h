#pragma once

#include "programs/webapi/Arguments.h"

namespace QELO::AuthorProgram {

/// webapi new: the files of a new API library.
ExitCode New(const Arguments& arguments);

}  // namespace QELO::AuthorProgram
