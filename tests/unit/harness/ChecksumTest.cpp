// QELO.Work.Checksum: a directory's checksums, in the background.

#include <gtest/gtest.h>
#include <webapi/testing/TestHost.h>

#include <filesystem>
#include <fstream>

#include "tests/support/FakeTask.h"

namespace {

using QELO::TestHost;

class Checksum : public testing::Test {
 protected:
  Checksum() {
    EXPECT_TRUE(host.Describe(API_DIR "/QELO.Work.Checksum.lib.in"));
    host.AddUser("alice", 1001);
    host.LogIn("alice");
  }
  QELO::TestAnswer Start(const Json::Value& path) {
    return host.Call("QELO.Work.Checksum", 1, "start", {{"path", path}});
  }

  TestHost host;
};

TEST_F(Checksum, FilesOfADirectoryAreRead) {
  const std::string directory = host.Directory() + "/files";
  std::filesystem::create_directory(directory);
  std::ofstream(directory + "/empty");
  const auto answer = Start(directory);
  EXPECT_EQ(answer.Data()["task_id"], "alice/checksum_id1") << answer;
  EXPECT_EQ(answer.account, "alice");
  const Json::Value data = host.WaitForTask("alice/checksum_id1")["data"];
  EXPECT_EQ(data["state"], "done");
  EXPECT_EQ(data["files"]["done"], 1);
  EXPECT_EQ(data["manifest"],
            "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855  empty\n");
}

TEST_F(Checksum, PathIsThatOfADirectory) {
  for (const Json::Value& path : {Json::Value("relative"), Json::Value(""), Json::Value(5)}) {
    EXPECT_EQ(Start(path).body, R"({"error":{"code":101},"success":false})");
  }
  const auto answer = Start("/nonexistent");
  EXPECT_EQ(answer.Code(), 400);
  EXPECT_EQ(answer.Errors()["reason"], "No such file or directory");
}

TEST_F(Checksum, FiveAtOnceAreTooMany) {
  Json::Value record;
  record["properties"]["auto_remove"] = false;
  record["pid"] = getpid();
  for (const char* id : {"checksum_1", "checksum_2", "checksum_3", "checksum_4"}) {
    FakeTask::Get().Put("alice", id, record);
  }
  EXPECT_EQ(Start("/").Code(), 401);
  for (const char* id : {"checksum_1", "checksum_2", "checksum_3", "checksum_4"}) {
    FakeTask::Get().Put("alice", id, Json::Value());  // the host would end their process
  }
}

}  // namespace
