#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include "webapi/JsonHelper.h"

using namespace QELO;
namespace fs = std::filesystem;

namespace {

class JsonFile : public testing::Test {
 protected:
  JsonFile() {
    std::string name = (fs::temp_directory_path() / "json-file-XXXXXX").string();
    directory_ = mkdtemp(name.data());
    path_ = directory_ / "value.json";
  }
  ~JsonFile() override { fs::remove_all(directory_); }

  void write(const std::string& text) const { std::ofstream(path_) << text; }

  std::string content() const {
    std::ifstream file(path_);
    return {std::istreambuf_iterator<char>(file), {}};
  }

  /// How many files there are, a temporary one included.
  long files() const { return std::distance(fs::directory_iterator(directory_), {}); }

  mode_t mode() const {
    struct stat info {};
    EXPECT_EQ(stat(path_.c_str(), &info), 0);
    return info.st_mode & 07777;
  }

  fs::path directory_;
  fs::path path_;
};

using JsonFromFile = JsonFile;
using JsonToFile = JsonFile;

/// Writes beyond a few bytes fail, as on a full disk, while this lives.
class FullDisk {
 public:
  FullDisk() {
    signal(SIGXFSZ, SIG_IGN);
    getrlimit(RLIMIT_FSIZE, &old_);
    const rlimit small{4, old_.rlim_max};
    setrlimit(RLIMIT_FSIZE, &small);
  }
  ~FullDisk() {
    setrlimit(RLIMIT_FSIZE, &old_);
    signal(SIGXFSZ, SIG_DFL);
  }

 private:
  rlimit old_{};
};

}  // namespace

TEST_F(JsonFromFile, ReadsCommentsAndAByteOrderMark) {
  write("\xEF\xBB\xBF// what it is for\n{ /* one */ \"a\": 1, // two\n \"b\": \"//\" } // end");
  Json::Value value;
  ASSERT_TRUE(JsonHelper::fromFile(path_, value));
  EXPECT_EQ(JsonHelper::toString(value), R"({"a":1,"b":"//"})");
}

TEST_F(JsonFromFile, ReadsAFileLargerThanItsBuffer) {
  const std::string text(100000, 'x');
  write("\"" + text + "\"");
  Json::Value value;
  ASSERT_TRUE(JsonHelper::fromFile(path_, value));
  EXPECT_EQ(value, Json::Value(text));
}

TEST_F(JsonFromFile, RefusesWhatIsNotJsonAndLeavesTheValue) {
  Json::Value value("kept");
  for (const char* text : {"", "{\"a\":1", "{} {}", "{\"a\":1,}", "/* open {}", "{} /* open"}) {
    write(text);
    EXPECT_FALSE(JsonHelper::fromFile(path_, value)) << text;
  }
  write(std::string(1000, '['));
  EXPECT_FALSE(JsonHelper::fromFile(path_, value));
  EXPECT_EQ(value, Json::Value("kept"));
}

TEST_F(JsonFromFile, RefusesAMissingFileADirectoryAndAPipe) {
  Json::Value value("kept");
  EXPECT_FALSE(JsonHelper::fromFile(path_, value));
  EXPECT_FALSE(JsonHelper::fromFile(directory_, value));
  ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
  EXPECT_FALSE(JsonHelper::fromFile(path_, value));
  EXPECT_EQ(value, Json::Value("kept"));
}

TEST_F(JsonToFile, WritesTheTextAndNothingElse) {
  Json::Value value;
  value["a"] = 1;
  EXPECT_TRUE(JsonHelper::toFile(path_, value));
  EXPECT_EQ(content(), R"({"a":1})");
  EXPECT_EQ(files(), 1);
}

TEST_F(JsonToFile, MakesANewFileForItsOwnerAlone) {
  EXPECT_TRUE(JsonHelper::toFile(path_, 1));
  EXPECT_EQ(mode(), 0600u);
}

TEST_F(JsonToFile, KeepsTheModeOfTheFileThatItReplaces) {
  write("old");
  fs::permissions(path_, fs::perms(0644));
  EXPECT_TRUE(JsonHelper::toFile(path_, 1));
  EXPECT_EQ(content(), "1");
  EXPECT_EQ(mode(), 0644u);
}

TEST_F(JsonToFile, ReplacesByRenameSoThatAReaderKeepsTheOldContent) {
  write("old");
  std::ifstream reader(path_);
  EXPECT_TRUE(JsonHelper::toFile(path_, 1));
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(reader), {}), "old");
}

TEST_F(JsonToFile, KeepsTheOldFileAndLeavesNoOtherWhenTheDiskIsFull) {
  write("old");
  {
    const FullDisk disk;
    EXPECT_FALSE(JsonHelper::toFile(path_, "a text longer than what fits"));
  }
  EXPECT_EQ(content(), "old");
  EXPECT_EQ(files(), 1);
}

TEST_F(JsonToFile, LeavesNoFileWhenTheNameIsADirectory) {
  fs::create_directory(path_);
  std::ofstream(path_ / "inside") << "x";
  EXPECT_FALSE(JsonHelper::toFile(path_, 1));
  EXPECT_TRUE(fs::is_directory(path_));
  EXPECT_EQ(files(), 1);
}

TEST_F(JsonToFile, FailsInAMissingDirectory) {
  EXPECT_FALSE(JsonHelper::toFile(directory_ / "missing" / "file", 1));
  EXPECT_EQ(files(), 0);
}

TEST_F(JsonToFile, IsReadBackByFromFile) {
  Json::Value value;
  value["text"] = "gr\xC3\xBC\xC3\x9F // no comment";
  ASSERT_TRUE(JsonHelper::toFile(path_, value));
  Json::Value again;
  ASSERT_TRUE(JsonHelper::fromFile(path_, again));
  EXPECT_EQ(again, value);
}
