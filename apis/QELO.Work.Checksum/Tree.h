#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace checksum {

/// A regular file that a walk has come to.
struct File {
  std::string name;   ///< below the directory, without a leading "/"
  std::string path;   ///< to open it from the working directory of the moment
  uint64_t size = 0;  ///< bytes, when it was seen
};

/// Visits the regular files below a directory in the order of their names. Symbolic links are not
/// followed; devices and the like are left out.
class Tree {
 public:
  /// @param directory      without symbolic links
  /// @param oneFileSystem  what is mounted below stays unvisited
  Tree(std::string directory, bool oneFileSystem);

  /// Changes the working directory while it runs.
  /// @param file   called with each file
  /// @param error  called with the name, "." for the directory itself, and errno of what could not
  ///               be read
  void Walk(const std::function<void(const File&)>& file,
            const std::function<void(const std::string&, int)>& error) const;

 private:
  std::string NameOf(const char* path) const;

  std::string directory_;
  bool oneFileSystem_;
};

}  // namespace checksum
