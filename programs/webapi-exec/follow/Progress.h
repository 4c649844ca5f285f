#pragma once

#include <json/json.h>

#include <cstdint>
#include <string>
#include <vector>

namespace QELO::ExecProgram {

/// How far a task is, as its body tells by the members of "data" that docs/webapi-exec.md lists.
struct Progress {
  struct Count {
    std::string name;
    uint64_t done = 0;
    uint64_t total = 0;
  };

  int percent = -1;           ///< 0 to 100; -1: not told
  std::vector<Count> counts;  ///< the one that the percentage comes from is the first
  std::string state;
  std::string current;
  int64_t secondsLeft = -1;  ///< -1: not told
};

/// @param body  {"success", "data" or "error"}; anything else is a progress of nothing
Progress readProgress(const Json::Value& body);

/// One line for people, in `columns` at most.
/// @param elapsed  seconds since the watching began
/// @param turn     moves the sign of life of a task that tells no progress
std::string progressLine(const Progress& progress, int64_t elapsed, unsigned turn, size_t columns);

}  // namespace QELO::ExecProgram
