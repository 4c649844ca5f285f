#include <dlfcn.h>
#include <syslog.h>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class LibraryLoading : public RunnerTest {
 protected:
  std::string Plugin(const std::string& name) {
    return std::string(TEST_PLUGIN_DIR) + "/" + name + ".so";
  }
  void Describe(const Json::Value& lib) {
    MakeRequest("QELO.Test.Call", 1, "run");
    Json::Value description;
    description["lib"] = lib;
    request->InitAPIInfo(description);
  }
  bool Open(const std::string& lib) {
    Describe(lib);
    table = nullptr;
    checkTable = nullptr;
    return tested.OpenLib(request.get(), &table, &checkTable);
  }
  TestRunner tested;
  _tag_API_TABLE* table = nullptr;
  _tag_API_CHECK_TABLE* checkTable = nullptr;
};

TEST_F(LibraryLoading, NullArgumentsAreRefused) {
  EXPECT_FALSE(tested.OpenLib(nullptr, &table, nullptr));
  Describe(Plugin("state"));
  EXPECT_FALSE(tested.OpenLib(request.get(), nullptr, nullptr));
  EXPECT_EQ(SyslogCapture::Count("Bad parameters"), 2);
}

TEST_F(LibraryLoading, OpensTablesOfALibrary) {
  ASSERT_TRUE(Open(Plugin("checked")));
  EXPECT_STREQ(table->api, "QELO.Test.Call");
  ASSERT_NE(checkTable, nullptr);
  EXPECT_STREQ(checkTable->method, "run");
}

TEST_F(LibraryLoading, CheckTableNeedNotBeAskedFor) {
  Describe(Plugin("checked"));
  EXPECT_TRUE(tested.OpenLib(request.get(), &table, nullptr));
  EXPECT_NE(table, nullptr);
}

TEST_F(LibraryLoading, LibraryWithoutCheckTableLoads) {
  EXPECT_TRUE(Open(Plugin("state")));
  EXPECT_EQ(checkTable, nullptr);
  EXPECT_EQ(SyslogCapture::Count("check table"), 0);
}

TEST_F(LibraryLoading, NullCheckTableIsLoggedAndLoads) {
  EXPECT_TRUE(Open(Plugin("null_check_table")));
  EXPECT_EQ(checkTable, nullptr);
  EXPECT_EQ(SyslogCapture::Count("cannot get api check table"), 1);
}

TEST_F(LibraryLoading, LibraryWithoutTableFails) {
  EXPECT_FALSE(Open(Plugin("no_table")));
  EXPECT_EQ(SyslogCapture::Count("cannot load table: "), 1);
  EXPECT_EQ(SyslogCapture::Messages().at(0).priority, LOG_DEBUG);
  EXPECT_EQ(SyslogCapture::Count("Get API Table Fail"), 1);
}

TEST_F(LibraryLoading, NullOrThrowingTableFails) {
  EXPECT_FALSE(Open(Plugin("null_table")));
  EXPECT_EQ(SyslogCapture::Count("cannot get api table"), 1);
  EXPECT_FALSE(Open(Plugin("throwing_table")));
  EXPECT_EQ(SyslogCapture::Count("GetAPITable threw an exception: no table today"), 1);
}

TEST_F(LibraryLoading, NullHandleOrTargetFailsSilently) {
  EXPECT_FALSE(tested.GetTableFunc(nullptr, &table));
  EXPECT_FALSE(tested.GetCheckTableFunc(nullptr, &checkTable));
  EXPECT_FALSE(tested.GetTableFunc(this, nullptr));
  EXPECT_FALSE(tested.GetCheckTableFunc(this, nullptr));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(LibraryLoading, EmptyPathFails) {
  EXPECT_FALSE(Open(""));
  EXPECT_EQ(SyslogCapture::Count("library path empty"), 1);
  Describe(Json::Value(Json::objectValue));
  EXPECT_FALSE(tested.OpenLib(request.get(), &table, nullptr));
  EXPECT_EQ(SyslogCapture::Count("library path empty"), 2);
}

TEST_F(LibraryLoading, MissingFileIsLoggedWithItsPath) {
  EXPECT_FALSE(Open("/no/such.so"));
  EXPECT_EQ(SyslogCapture::Count("cannot open library: /no/such.so. error = "), 1);
}

TEST_F(LibraryLoading, LibraryThatOthersMayWriteIsRefused) {
  namespace fs = std::filesystem;
  const fs::path copy = directory / "copy.so";
  fs::copy_file(Plugin("state"), copy);
  fs::permissions(copy, fs::perms::group_write, fs::perm_options::add);
  EXPECT_FALSE(Open(copy.string()));
  EXPECT_EQ(SyslogCapture::Count("cannot open library: " + copy.string() +
                                 ". error = others may write it or its directory"),
            1);
  fs::permissions(copy, fs::perms::group_write, fs::perm_options::remove);
  fs::permissions(directory, fs::perms::others_write, fs::perm_options::add);
  EXPECT_FALSE(Open(copy.string()));
  fs::permissions(directory, fs::perms::others_write, fs::perm_options::remove);
  EXPECT_TRUE(Open(copy.string()));
}

TEST_F(LibraryLoading, OnePathIsOpenedOnce) {
  const std::string copy = (directory / "copy.so").string();
  std::filesystem::copy_file(Plugin("state"), copy);
  void* first = nullptr;
  void* second = nullptr;
  Describe(copy);
  EXPECT_TRUE(tested.CacheLib(request.get(), &first));
  std::filesystem::remove(copy);  // a second opening would fail
  EXPECT_TRUE(tested.CacheLib(request.get(), &second));
  EXPECT_EQ(first, second);
  tested.CloseLib();
  EXPECT_FALSE(tested.CacheLib(request.get(), &second));
}

TEST_F(LibraryLoading, TwoSpellingsOfOnePathAreTwoOpenings) {
  const std::string copy = (directory / "copy.so").string();
  const std::string spelling = (directory / "." / "copy.so").string();
  std::filesystem::copy_file(Plugin("state"), copy);
  EXPECT_TRUE(Open(copy));
  EXPECT_TRUE(Open(spelling));
  EXPECT_NE(table, nullptr);
  std::filesystem::remove(copy);
  EXPECT_TRUE(Open(copy));
  EXPECT_TRUE(Open(spelling));
  EXPECT_FALSE(Open((directory / "." / "." / "copy.so").string()));
}

TEST_F(LibraryLoading, EverySpellingOfAPathIsClosed) {
  const std::string copy = (directory / "copy.so").string();
  std::filesystem::copy_file(Plugin("state"), copy);
  EXPECT_TRUE(Open(copy));
  EXPECT_TRUE(Open((directory / "." / "copy.so").string()));
  void* handle = dlopen(copy.c_str(), RTLD_LAZY | RTLD_NOLOAD);
  ASSERT_NE(handle, nullptr);
  dlclose(handle);
  tested.CloseLib();
  EXPECT_EQ(dlopen(copy.c_str(), RTLD_LAZY | RTLD_NOLOAD), nullptr);
}

TEST_F(LibraryLoading, TwoApisOfOneLibraryShareItsOpening) {
  const std::string copy = (directory / "copy.so").string();
  std::filesystem::copy_file(Plugin("identity"), copy);
  for (const char* api : {"QELO.Test.Identity", "QELO.Test.Open"}) {
    Json::Value description = Parse(R"({"minVersion": 1, "maxVersion": 1,
                                        "methods": {"1": ["plain"]}})");
    description["lib"] = copy;
    WriteDescription(description, api);
  }
  MakeRequest("QELO.Test.Identity", 1, "plain");
  EXPECT_TRUE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 0);
  std::filesystem::remove(copy);  // a second opening would fail
  MakeRequest("QELO.Test.Open", 1, "plain");
  EXPECT_TRUE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 0);
  EXPECT_EQ(Data()["parameters"]["api"], Json::Value("QELO.Test.Open"));
}

}  // namespace
}  // namespace QELO
