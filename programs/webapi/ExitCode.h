#pragma once

namespace QELO::AuthorProgram {

/// The exit codes of webapi's commands but "call", which has those of webapi-exec.
enum ExitCode : int {
  kDone = 0,
  kFailed = 1,    ///< a command says what that means
  kWrongUse = 2,  ///< of the command line, or a file that cannot be read
};

}  // namespace QELO::AuthorProgram
