#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

namespace QELO {

/// A directory of the test's own.
class TemporaryDir : public testing::Test {
 protected:
  TemporaryDir() {
    std::string name = (std::filesystem::temp_directory_path() / "base-XXXXXX").string();
    directory_ = mkdtemp(name.data());
  }
  ~TemporaryDir() override { std::filesystem::remove_all(directory_); }

  std::string Path(const std::string& name) const { return directory_ / name; }
  void Write(const std::string& name, const std::string& text) const {
    std::ofstream(Path(name)) << text;
  }
  std::string Content(const std::string& name) const {
    std::ifstream file(Path(name));
    return {std::istreambuf_iterator<char>(file), {}};
  }
  /// How many files there are, temporary ones included.
  long Files() const { return std::distance(std::filesystem::directory_iterator(directory_), {}); }

  std::filesystem::path directory_;
};

}  // namespace QELO
