#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include "paths/Folder.h"

namespace files {

/// A shared folder with something beside it that no call may reach.
class SharedFolder : public testing::Test {
 protected:
  SharedFolder() {
    std::string name = (std::filesystem::temp_directory_path() / "files-XXXXXX").string();
    around_ = std::filesystem::canonical(mkdtemp(name.data()));
    std::filesystem::create_directory(around_ / "share");
    std::filesystem::create_directory(around_ / "outside");
    Write(around_ / "outside/secret", "secret");
    share_ = {.name = "share", .path = Path("").parent_path().string(), .comment = ""};
  }
  ~SharedFolder() override { std::filesystem::remove_all(around_); }

  void SetUp() override { ASSERT_EQ(Folder::OpenShare(share_, folder_), Reason::kNone); }

  /// Of something within the shared folder.
  std::filesystem::path Path(const std::string& below) const { return around_ / "share" / below; }
  std::filesystem::path Outside(const std::string& below) const {
    return around_ / "outside" / below;
  }
  void MakeFolder(const std::string& below) const {
    std::filesystem::create_directories(Path(below));
  }
  static void Write(const std::filesystem::path& path, const std::string& text) {
    std::ofstream(path) << text;
  }
  static std::string Content(const std::filesystem::path& path) {
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  bool IsThere(const std::string& below) const {
    return std::filesystem::exists(std::filesystem::symlink_status(Path(below)));
  }

  std::filesystem::path around_;
  Share share_;
  Folder folder_;  ///< the shared folder
};

}  // namespace files
