#include "paths/Shares.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

using namespace files;

namespace {

class SharesFile : public testing::Test {
 protected:
  SharesFile() {
    std::string name = (std::filesystem::temp_directory_path() / "shares-XXXXXX").string();
    directory_ = mkdtemp(name.data());
  }
  ~SharesFile() override { std::filesystem::remove_all(directory_); }

  std::string Put(const std::string& text) const {
    std::ofstream(File()) << text;
    chmod(File().c_str(), 0644);
    return File();
  }
  std::string File() const { return directory_ / "shares.json"; }
  /// The names offered, each with a blank behind it.
  std::string Names(const std::string& user = "alice", bool isAdministrator = false) const {
    std::string names;
    const Shares shares(File(), user, isAdministrator);
    for (const Share& share : shares.All()) {
      names += share.name + " ";
    }
    return names;
  }

  std::filesystem::path directory_;
};

}  // namespace

TEST_F(SharesFile, OffersWhatIsTheUsers) {
  Put(R"({"shares": [
    {"name": "all", "path": "/srv/all"},
    {"name": "alices", "path": "/srv/a", "users": ["alice"]},
    {"name": "bobs", "path": "/srv/b", "users": ["bob"]},
    {"name": "admins", "path": "/srv/c", "users": ["@administrators"]},
    {"name": "nobodys", "path": "/srv/d", "users": []}]})");
  EXPECT_EQ(Names("alice"), "all alices ");
  EXPECT_EQ(Names("bob"), "all bobs ");
  EXPECT_EQ(Names("carol", true), "all admins ");
  EXPECT_EQ(Names("@administrators"), "all admins ") << "no account has such a name";
  EXPECT_EQ(Names(""), "") << "nobody is logged in";
}

TEST_F(SharesFile, ReadsEachMember) {
  const Shares shares(Put(R"({"shares": [
    {"name": "a", "path": "/srv/a", "comment": "of a", "read_only": true},
    {"name": "b", "path": "/srv/b", "read_only": false}]})"),
                      "alice", false);
  ASSERT_NE(shares.Find("a"), nullptr);
  EXPECT_EQ(shares.Find("a")->path, "/srv/a");
  EXPECT_EQ(shares.Find("a")->comment, "of a");
  EXPECT_TRUE(shares.Find("a")->isReadOnly);
  ASSERT_NE(shares.Find("b"), nullptr);
  EXPECT_FALSE(shares.Find("b")->isReadOnly);
  EXPECT_EQ(shares.Find("c"), nullptr);
}

TEST_F(SharesFile, MarkInAPathIsTheUser) {
  Put(R"({"shares": [{"name": "own", "path": "/home/{user}/files"}]})");
  EXPECT_EQ(Shares(File(), "alice", false).Find("own")->path, "/home/alice/files");
  for (const std::string& user : {std::string(".."), std::string("a/b"), std::string("a\0b", 3)}) {
    EXPECT_EQ(Names(user), "") << user;
  }
}

TEST_F(SharesFile, MalformedEntriesAreLeftOutAndTheStrictestIsTaken) {
  const Shares shares(Put(R"({"shares": [
    7, {"name": "a"}, {"path": "/srv"}, {"name": "b", "path": "srv"}, {"name": "..", "path": "/srv"},
    {"name": "a/b", "path": "/srv"}, {"name": "c", "path": "/srv", "users": "alice"},
    {"name": "d", "path": "/srv", "read_only": "no"}, {"name": "d", "path": "/second"}]})"),
                      "alice", false);
  ASSERT_EQ(shares.All().size(), 1U);
  EXPECT_EQ(shares.All()[0].name, "d");
  EXPECT_EQ(shares.All()[0].path, "/srv");
  EXPECT_TRUE(shares.All()[0].isReadOnly);
}

TEST_F(SharesFile, UnreadableFilesOfferNothing) {
  EXPECT_EQ(Names(), "") << "there is none";
  Put("no JSON");
  EXPECT_EQ(Names(), "");
  Put(R"({"shares": {}})");
  EXPECT_EQ(Names(), "");
  Put("[]");
  EXPECT_EQ(Names(), "");
}

TEST_F(SharesFile, FileThatOthersMayChangeIsNotBelieved) {
  Put(R"({"shares": [{"name": "a", "path": "/srv"}]})");
  ASSERT_EQ(Names(), "a ");
  chmod(File().c_str(), 0664);
  EXPECT_EQ(Names(), "");
  chmod(File().c_str(), 0644);
  chmod(directory_.c_str(), 0777);
  EXPECT_EQ(Names(), "");
  chmod(directory_.c_str(), 0755);
  ASSERT_EQ(Names(), "a ");
  std::filesystem::rename(File(), directory_ / "real");
  std::filesystem::create_symlink("real", File());
  EXPECT_EQ(Names(), "") << "a link's place is not the file's";
  if (geteuid() == 0) {
    std::filesystem::remove(File());
    Put(R"({"shares": [{"name": "a", "path": "/srv"}]})");
    ASSERT_EQ(chown(File().c_str(), 1000, 1000), 0);
    EXPECT_EQ(Names(), "");
  }
}

TEST_F(SharesFile, NumberAndSizeHaveLimits) {
  std::string text;
  for (size_t i = 0; i <= Shares::kMost; ++i) {
    text += (i == 0 ? "" : ",") + std::string(R"({"name": "n)") + std::to_string(i) +
            R"(", "path": "/srv"})";
  }
  const Shares shares(Put(R"({"shares": [)" + text + "]}"), "alice", false);
  EXPECT_EQ(shares.All().size(), Shares::kMost);
  Put(R"({"shares": [{"name": "a", "path": "/srv"}]})" + std::string(Shares::kLargestFile, ' '));
  EXPECT_EQ(Names(), "");
}
