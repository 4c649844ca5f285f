#pragma once

#include <json/json.h>

#include "programs/webapi-exec-options.h"

namespace QELO::ExecProgram {

/// Prints a call's answer to standard output.
void printAnswer(const Json::Value& answer);

/// Prints a call's answer to standard output, and what its error code means to standard error.
ExitCode showAnswer(const Json::Value& answer);

/// Prints the results of a batch as a table, in the order of its calls.
ExitCode showTable(const Json::Value& calls, const Json::Value& answer);

}  // namespace QELO::ExecProgram
