#pragma once

#include <json/json.h>
#include <sys/stat.h>

#include <cstdint>
#include <map>
#include <string>

namespace QELO::ExecProgram {

/// The one file of an upload, as the rest of what a call before this one has brought: that was
/// ended in the middle, and this one goes on.
class SentSlice {
 public:
  /// Smaller files, in bytes, are sent anew.
  static constexpr off_t kWorthwhile = 1 << 20;

  /// Looks for what there is. Nothing is said of slices when they cannot be put together here, as
  /// for an account that may not write where they are recorded.
  /// @param caller  whose call it is
  /// @param call    what is called; others have a part of their own
  /// @param file    which is another one when it is changed
  void Find(uid_t caller, const std::string& call, const struct stat& file);

  /// Bytes that are there.
  uint64_t There() const { return there_; }
  /// Adds what the call's request says.
  void Tell(Json::Value& request) const;

 private:
  std::map<std::string, std::string> said_;  ///< CGI variables
  uint64_t there_ = 0;
};

}  // namespace QELO::ExecProgram
