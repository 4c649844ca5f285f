#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace QELO::Platform {

/// The header of an answer while it is made. Names are alike whatever their capitals.
class Head {
 public:
  Head() = default;
  /// @param lines  "Name: value"
  explicit Head(const std::vector<std::string>& lines);

  /// The value, without blanks around it; "" when there is none.
  std::string Get(std::string_view name) const;
  /// Replaces the line of that name where it stands, or adds one.
  void Set(std::string_view name, std::string_view value);
  /// Adds a line unless there is one of that name.
  void SetDefault(std::string_view name, std::string_view value);
  /// @param prefix  of the names of those that go
  void Remove(std::string_view prefix);

  /// All lines and the empty one.
  std::string Text() const;

 private:
  std::vector<std::string>::const_iterator Find(std::string_view name) const;

  std::vector<std::string> lines_;
};

}  // namespace QELO::Platform
