#pragma once

#include <json/json.h>
#include <time.h>

#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>

namespace QELO {

/// Which calls may be workers', as far as the server itself needs to know: a front looks at each
/// request's own description, and leaves what is no worker's. So what is old or wrong here costs
/// time alone.
class WorkerCalls {
 public:
  /// Whether a method with these attributes can be called in a worker: its author lets calls share
  /// a process, and it neither reads nor writes the connection, nor is root or has a way back to
  /// it.
  static bool Fit(const Json::Value& attributes);

  /// Reads the descriptions of the working directory. Values of "isolation" that nobody knows are
  /// logged.
  void Read();
  /// Reads them again when a file was added, replaced or removed; looks once a second at most.
  void Refresh();

  /// Whether a query or a form's body seems to name one of the calls.
  bool MayName(std::string_view line) const;

 private:
  using Methods = std::unordered_set<std::string>;
  void Add(const std::string& api, const Json::Value& description);

  std::unordered_map<std::string, Methods> calls_;
  timespec changed_{};  ///< the directory's time of change when it was read
  time_t looked_ = 0;
  time_t read_ = 0;
};

}  // namespace QELO
