#pragma once

#include <string>
#include <string_view>

namespace QELO::Platform {

/// Where in a value: the way down to it, each step on the stack of the one who takes it.
class Place {
 public:
  static constexpr size_t kLongestPath = 512;  ///< bytes of a path that is told; names are clients'

  Place() = default;
  Place(const Place& above, std::string_view name) : above_(&above), name_(name) {}
  Place(const Place& above, size_t index) : above_(&above), index_(index), isIndex_(true) {}

  /// As a JSON pointer; one that is too long ends in "...".
  std::string Path() const {
    if (above_ == nullptr) {
      return "";
    }
    std::string path = above_->Path();
    path += '/';
    if (isIndex_) {
      path += std::to_string(index_);
    } else {
      Append(path);
    }
    if (path.size() > kLongestPath) {
      path.resize(kLongestPath);
      path += "...";
    }
    return path;
  }

 private:
  void Append(std::string& path) const {
    for (const char c : name_.substr(0, kLongestPath)) {
      if (c == '~') {
        path += "~0";
      } else if (c == '/') {
        path += "~1";
      } else {
        path += c;
      }
    }
  }

  const Place* above_ = nullptr;
  std::string_view name_;
  size_t index_ = 0;
  bool isIndex_ = false;
};

}  // namespace QELO::Platform
