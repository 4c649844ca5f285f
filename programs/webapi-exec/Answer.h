#pragma once

#include <json/json.h>

#include "programs/webapi-exec/Options.h"

namespace QELO::ExecProgram {

/// Prints a call's answer to standard output.
void printAnswer(const Json::Value& answer);

/// Prints an answer to standard output, and what its error code means to standard error.
ExitCode showAnswer(const Json::Value& answer);
/// Likewise of the call that the options tell, also with what it lacked when it was not run.
ExitCode showAnswer(const Options& options, const Json::Value& answer);

/// Prints the results of a batch as a table, in the order of its calls.
ExitCode showTable(const Options& options, const Json::Value& answer);

}  // namespace QELO::ExecProgram
