#pragma once

#include "programs/webapi-exec/Options.h"

namespace QELO::ExecProgram {

/// What messages and the help call the program: "webapi call" is another name of it.
inline const char* programName = "webapi-exec";

/// Does all that the program does, with a command line whose first word is a name.
ExitCode run(int argc, char** argv);

}  // namespace QELO::ExecProgram
