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
};

}  // namespace QELO
