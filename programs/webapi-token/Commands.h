#pragma once

#include <cstdio>
#include <string>
#include <vector>

namespace QELO::TokenProgram {

/// The exit codes of webapi-token.
enum ExitCode : int { kDone = 0, kFailed = 1, kWrongUse = 2 };

/// Runs one command of webapi-token.
/// @param arguments  without the program's name
/// @param output     receives the token or the list
/// @param messages   receives everything else
ExitCode run(const std::vector<std::string>& arguments, FILE* output, FILE* messages);

}  // namespace QELO::TokenProgram
