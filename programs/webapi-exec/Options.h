#pragma once

#include <json/json.h>

#include <string>
#include <utility>
#include <vector>

namespace QELO::ExecProgram {

/// The exit codes of webapi-exec.
enum ExitCode : int {
  kDone = 0,
  kFailed = 1,
  kWrongUse = 2,
  kLeft = 130,  ///< a task that was followed goes on; 128 and the number of SIGINT
};

extern const char kHelp[];

/// What the command line asks for.
struct Options {
  bool help = false;
  bool list = false;  ///< names instead of a call: of APIs, or of the methods of `api`
  std::string api;
  int version = 0;  ///< 0: not given
  std::string method;
  std::string user;
  Json::Value params{Json::objectValue};
  Json::Value sent{Json::objectValue};  ///< texts of parameters, for methods that declare texts
  std::vector<std::pair<std::string, std::string>> uploads;  ///< fields and files
  std::string output;   ///< file for what the method prints, "" for none
  std::string batch;    ///< file of calls, "" for a single call
  Json::Value calls;    ///< the batch's calls
  bool follow = false;  ///< the call starts a task, which is watched until it ends
  std::string task;     ///< task to follow instead of a call, "" for none
};

/// Reads the command line, and the files that give parameters; "-" is standard input.
/// @return what is wrong, or ""
std::string readOptions(int argc, char** argv, Options& options);

}  // namespace QELO::ExecProgram
