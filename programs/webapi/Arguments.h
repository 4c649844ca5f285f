#pragma once

#include <string>
#include <vector>

#include "programs/webapi/ExitCode.h"

namespace QELO::AuthorProgram {

/// A command's words behind its name.
using Arguments = std::vector<std::string>;

/// What a command takes.
struct Option {
  const char* name;              ///< as "--library"
  std::string* value = nullptr;  ///< receives the next argument, or what follows a "="
  bool* flag = nullptr;          ///< for an option without a value
};

/// Takes the options out of the arguments, wherever they stand; behind "--" there are none.
/// @param words  receives the other arguments
/// @return what is wrong, or ""
std::string ReadArguments(const Arguments& arguments, const std::vector<Option>& options,
                          std::vector<std::string>& words);

/// Whether a user asks for help: an argument is "--help" or "-h".
bool AsksForHelp(const Arguments& arguments);

/// Says to standard error what is wrong with the use of a command.
ExitCode WrongUse(const char* command, const std::string& reason);

/// A text of a file or of the command line as one line that commands no terminal.
std::string Shown(const std::string& text);

}  // namespace QELO::AuthorProgram
