#pragma once

#include <string>
#include <vector>

#include "paths/Reason.h"

namespace files {

/// Whether a file or folder may be given this name: UTF-8 of 1 to 255 bytes, no control character,
/// no "/", not "." or "..", and none that the API's own temporary files have.
bool isNewName(const std::string& name);

/// Whether a name is one of the API's own, of files that are not finished yet.
bool isTemporaryName(const std::string& name);

/// What the names of files that are not finished yet begin with.
inline constexpr char kTemporaryPrefix[] = ".qelo-part-";

/// A path as clients write it: "/SHARE/FOLDER/NAME". "/" is the list of shared folders.
///
/// No part of it is ".", ".." or empty, so it leads nowhere but down.
class VirtualPath {
 public:
  static constexpr size_t kLongest = 4096;     ///< bytes
  static constexpr size_t kLongestName = 255;  ///< bytes of a part
  static constexpr size_t kDeepest = 64;       ///< parts
  static constexpr size_t kDeepestWalk = 128;  ///< folders that a walk goes down from a path

  /// The list of shared folders.
  VirtualPath() = default;

  /// One "/" at the end is left away.
  /// @param path  unchanged when the text is refused
  /// @return kNone, kBadPath, or kTooDeep
  static Reason Parse(const std::string& text, VirtualPath& path);

  bool IsRoot() const { return parts_.empty(); }
  bool IsShare() const { return parts_.size() == 1; }
  /// The shared folder's name; "" for the root.
  std::string Share() const { return parts_.empty() ? "" : parts_.front(); }
  /// The last part; "" for the root.
  std::string Name() const { return parts_.empty() ? "" : parts_.back(); }
  /// The path below the shared folder, "." for that itself.
  std::string Below() const;
  /// The folder around it; the root's is the root.
  VirtualPath Parent() const;
  /// What is named so in this folder.
  VirtualPath Child(const std::string& name) const;
  size_t Depth() const { return parts_.size(); }
  std::string Text() const;
  /// Whether this is `folder` or somewhere within.
  bool IsWithin(const VirtualPath& folder) const;

 private:
  std::vector<std::string> parts_;
};

}  // namespace files
