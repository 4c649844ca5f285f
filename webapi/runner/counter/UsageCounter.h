#pragma once

#include <string>
#include <utility>

namespace QELO {

class APIRequest;

/// Counts calls per API, version and method in JSON files that another program of the system
/// collects: one file per family of APIs, {"<api>_<version>_<method>": {"count", "ctime"}}.
/// Any number of processes may count at once.
class UsageCounter {
 public:
  /// @param directory  made at the first count
  explicit UsageCounter(std::string directory) : directory_(std::move(directory)) {}

  /// Adds one. Failures lose this one count silently: counting never fails a request.
  /// @return whether the file was written
  bool Increase(const std::string& api, const std::string& method, int version);

  /// Counts the request's call, if the system collects such data.
  static void Count(const APIRequest& request);
  /// The same in a process that lives on, whose settings may change meanwhile.
  static void CountInResident(const APIRequest& request);

 private:
  bool PrepareDirectory();

  std::string directory_;
  bool ready_ = false;
};

}  // namespace QELO
