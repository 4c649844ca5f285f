#pragma once

#include <fcntl.h>
#include <sys/types.h>

#include <string>
#include <string_view>

namespace QELO {

/// How a file is replaced.
struct Replacement {
  int directory = AT_FDCWD;  ///< where a relative path starts
  /// What the new text's path has behind the file's until it is in place. The caller keeps others
  /// from replacing the file meanwhile; processes that are killed then leave one such file at most.
  /// Empty: each has one of its own.
  std::string_view freshSuffix = {};
  mode_t mode = 0600;       ///< of a file that is new; one that is replaced hands its own on
  bool keepsOwner = false;  ///< and its owner and group too, or nothing is replaced
  bool isSynced = false;    ///< on the disk before it is in place
};

/// Replaces a file's text in one step: readers see the old text or the new.
/// @return false on failure, with errno: the old text is still there, and nothing beside it
bool ReplaceFile(const std::string& path, std::string_view text, const Replacement& how = {});

}  // namespace QELO
