#pragma once

#include <string>
#include <vector>

namespace files {

/// A folder of the host that clients may work in.
struct Share {
  std::string name;
  std::string path;     ///< on the host
  std::string comment;  ///< for people
  bool isReadOnly = false;
};

/// The shared folders that the configuration offers to a user.
///
/// The configuration is a file of JSON text that belongs to root or the process's user and that
/// nobody else may write:
///
///   {"shares": [{"name": "photos", "path": "/srv/photos", "comment": "...", "read_only": true,
///                "users": ["alice", "@administrators"]}]}
///
/// Without "users" a folder is everybody's. "{user}" in a path is the user's name.
class Shares {
 public:
  static constexpr size_t kLargestFile = 1 << 20;  ///< bytes of the configuration
  static constexpr size_t kMost = 1000;            ///< entries; further ones are left out

  /// A file that cannot be read or is not believed offers nothing, and so does an entry that is
  /// malformed.
  Shares(const std::string& file, const std::string& user, bool isAdministrator);

  /// In the order of the configuration.
  const std::vector<Share>& All() const { return shares_; }
  /// @return null when there is none of that name for this user
  const Share* Find(const std::string& name) const;

 private:
  std::vector<Share> shares_;
};

}  // namespace files
