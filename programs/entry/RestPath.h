#pragma once

#include <string>
#include <string_view>

namespace QELO {

/// A call as the path of an address names it.
struct RestPath {
  std::string api;
  int version = 0;
  std::string method;

  /// @param path  "/QELO.Host.Info/v1/get"
  /// @return false when it names no call
  static bool Read(std::string_view path, RestPath& call);

  /// Whether a request came by an address of methods, where one program serves others, too: the
  /// last part of the script's name is "rest". Some web servers leave a path with escapes in the
  /// script's name as well; then any part may be.
  static bool IsAddress(std::string_view scriptName, std::string_view pathInfo);
};

}  // namespace QELO
