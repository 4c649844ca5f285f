// Which library checks the calls by a link, and how it is opened and asked for its table.

#include <dlfcn.h>

#include "tests/unit/entry/sharing/Fixture.h"

namespace QELO {
namespace {

class LinkLibrary : public Links {
 protected:
  std::string PathOf(const std::string& project) {
    link.projectName = project;
    MakeRequest();
    return entry->GetSharingCheckLibPath(entry->Request());
  }
  bool Open() {
    MakeRequest();
    return entry->OpenSharingCheckLib(entry->Request(), &table);
  }
  _tag_API_SHARING_CHECK_TABLE* table = nullptr;
};

TEST_F(LinkLibrary, StandsInTheFixedDirectoryUnderTheProjectsName) {
  EXPECT_EQ(PathOf("files"), Paths::kSharingCheckDir + std::string("files.so"));
  EXPECT_EQ(PathOf("QELO.Files_2-b"), Paths::kSharingCheckDir + std::string("QELO.Files_2-b.so"));
  EXPECT_EQ(PathOf(std::string(64, 'x')), Paths::kSharingCheckDir + std::string(64, 'x') + ".so");
}

TEST_F(LinkLibrary, OfAnyProjectWithinTheDirectoryIsItsName) {
  for (const std::string project :
       {"a/b", "/files", "..", ".files", "", "a b", "\xC3\xA4", "a..b"}) {
    EXPECT_EQ(PathOf(project), Paths::kSharingCheckDir + project + ".so");
  }
}

TEST_F(LinkLibrary, ProjectThatLeadsElsewhereHasNone) {
  for (const char* project : {"../files", "a/../../files", "../", "a../b"}) {
    EXPECT_EQ(PathOf(project), "") << project;
  }
  EXPECT_EQ(PathOf(std::string("a\0b", 3)), "");
  EXPECT_EQ(entry->GetSharingCheckLibPath(nullptr), "");
}

TEST_F(LinkLibrary, OpenGivesTheTable) {
  Install("link_checks");
  EXPECT_TRUE(Open());
  ASSERT_NE(table, nullptr);
  EXPECT_STREQ(table->api, "^QELO[.]Test[.]Good$");
}

TEST_F(LinkLibrary, OpenedOnceIsNotOpenedAgain) {
  Install("link_checks");
  ASSERT_TRUE(Open());
  std::filesystem::remove(LibraryPath());
  EXPECT_TRUE(Open());
}

TEST_F(LinkLibrary, EmptyPathIsLogged) {
  link.projectName = "../files";
  EXPECT_FALSE(Open());
  EXPECT_EQ(Logged(LOG_ERR, "Bad parameters"), 1);
}

TEST_F(LinkLibrary, MissingFileIsLoggedWithPathAndReason) {
  EXPECT_FALSE(Open());
  EXPECT_EQ(Logged(LOG_ERR, "cannot open library: " + LibraryPath() + ". error = " + LibraryPath() +
                                ": cannot open shared object file: No such file or directory"),
            1);
}

TEST_F(LinkLibrary, FileThatOthersMayWriteIsNotOpened) {
  Install("link_checks");
  std::filesystem::permissions(LibraryPath(), std::filesystem::perms{0666});
  EXPECT_FALSE(Open());
  EXPECT_EQ(Logged(LOG_ERR, "cannot open library: " + LibraryPath() +
                                ". error = others may write it or its directory"),
            1);
}

TEST_F(LinkLibrary, DirectoryThatOthersMayWriteIsNotUsed) {
  Install("link_checks");
  std::filesystem::permissions(Paths::kSharingCheckDir, std::filesystem::perms{0777});
  EXPECT_FALSE(Open());
  std::filesystem::permissions(Paths::kSharingCheckDir, std::filesystem::perms{0755});
}

TEST_F(LinkLibrary, WithoutTheFunctionIsLogged) {
  Install("no_table");
  EXPECT_FALSE(Open());
  EXPECT_EQ(Logged(LOG_ERR, "cannot load sharing check table: " + LibraryPath() +
                                ": undefined symbol: GetAPISharingCheckTable"),
            1);
  EXPECT_EQ(Logged(LOG_ERR, "Get Sharing Check Table Fail"), 1);
}

TEST_F(LinkLibrary, NullTableIsLogged) {
  Install("link_null_table");
  EXPECT_FALSE(Open());
  EXPECT_EQ(Logged(LOG_ERR, "cannot get sharing check table"), 1);
  EXPECT_EQ(Logged(LOG_ERR, "Get Sharing Check Table Fail"), 1);
}

TEST_F(LinkLibrary, ExceptionOfTheTablesFunctionEndsHere) {
  Install("link_throwing_table");
  EXPECT_FALSE(Open());
  EXPECT_EQ(Logged(LOG_ERR, "GetAPISharingCheckTable threw an exception: no checks today"), 1);
  EXPECT_EQ(Logged(LOG_ERR, "cannot get sharing check table"), 1);
}

TEST_F(LinkLibrary, TableOfNoLibraryOrForNobodyIsNone) {
  EXPECT_FALSE(entry->GetSharingCheckTableFunc(nullptr, &table));
  Install("link_checks");
  void* handle = dlopen(LibraryPath().c_str(), RTLD_LAZY);
  ASSERT_NE(handle, nullptr);
  EXPECT_FALSE(entry->GetSharingCheckTableFunc(handle, nullptr));
  EXPECT_TRUE(entry->GetSharingCheckTableFunc(handle, &table));
}

}  // namespace
}  // namespace QELO
