// API libraries that a long-lived process has loaded ahead.

#include <dlfcn.h>

#include <iterator>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class Preloading : public RunnerTest {
 protected:
  /// A path of the test's own that leads to a plugin, which was built long ago.
  std::string PathTo(const std::string& plugin) {
    const std::string path = (directory / "library.so").string();
    std::filesystem::remove(path);
    std::filesystem::create_symlink(std::string(TEST_PLUGIN_DIR) + "/" + plugin + ".so", path);
    return path;
  }
  /// The file that a fresh runner has the path's table from.
  std::string FileOf(const std::string& path) {
    MakeRequest("QELO.Test.Call", 1, "run");
    Json::Value description;
    description["lib"] = path;
    request->InitAPIInfo(description);
    TestRunner tested;
    _tag_API_TABLE* table = nullptr;
    Dl_info info{};
    return tested.OpenLib(request.get(), &table, nullptr) && dladdr(table, &info) != 0
               ? info.dli_fname
               : "";
  }
};

TEST_F(Preloading, RunnerHasThePrivateCopyOnce) {
  const std::string path = PathTo("state");
  ASSERT_TRUE(APIRunner::PreloadLibrary(path));
  EXPECT_EQ(FileOf(path).rfind("/proc/self/fd/", 0), 0u);
  EXPECT_EQ(FileOf(path), path);  // the first runner has closed it
}

TEST_F(Preloading, ClosingRunsTheDestructorsOnceAndLeavesTheLibrary) {
  const std::string path = PathTo("printing");
  testing::internal::CaptureStdout();
  ASSERT_TRUE(APIRunner::PreloadLibrary(path));
  testing::internal::GetCapturedStdout();
  testing::internal::CaptureStdout();
  const std::string copy = FileOf(path);
  const std::string printed = testing::internal::GetCapturedStdout();
  const size_t first = printed.find("<descriptor>");
  EXPECT_NE(first, std::string::npos);
  EXPECT_EQ(printed.find("<descriptor>", first + 1), std::string::npos);
  EXPECT_EQ(copy.rfind("/proc/self/fd/", 0), 0u);
  void* there = dlopen(copy.c_str(), RTLD_LAZY | RTLD_NOLOAD);
  ASSERT_NE(there, nullptr);
  dlclose(there);
}

TEST_F(Preloading, FileThatHasNotChangedIsNotCopiedAgain) {
  const std::string path = PathTo("state");
  const auto descriptors = [] {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
  };
  ASSERT_TRUE(APIRunner::PreloadLibrary(path));
  const auto before = descriptors();
  ASSERT_TRUE(APIRunner::PreloadLibrary(path));
  EXPECT_EQ(descriptors(), before);
}

TEST_F(Preloading, FileThatIsAnotherByNowIsLoadedItself) {
  const std::string path = PathTo("state");
  ASSERT_TRUE(APIRunner::PreloadLibrary(path));
  EXPECT_EQ(FileOf(PathTo("checked")), path);
}

TEST_F(Preloading, RefreshLoadsWhatHasChanged) {
  const std::string path = PathTo("state");
  ASSERT_TRUE(APIRunner::PreloadLibrary(path));
  PathTo("checked");
  APIRunner::RefreshLibraries();
  EXPECT_EQ(FileOf(path).rfind("/proc/self/fd/", 0), 0u);
}

TEST_F(Preloading, FileThatWasJustWrittenIsLeftToLater) {
  const std::string path = (directory / "fresh.so").string();
  std::filesystem::copy_file(std::string(TEST_PLUGIN_DIR) + "/state.so", path);
  EXPECT_FALSE(APIRunner::PreloadLibrary(path));
  EXPECT_EQ(SyslogCapture::Count("not loaded ahead: " + path + ": it was written just now"), 1);
  EXPECT_EQ(FileOf(path), path);
}

TEST_F(Preloading, WhatTheLoaderRefusesEndsNobody) {
  const std::string path = PathTo("throwing_constructor");
  EXPECT_FALSE(APIRunner::PreloadLibrary(path));
  EXPECT_EQ(SyslogCapture::Count(": the loader refuses it"), 1);
  EXPECT_FALSE(APIRunner::PreloadLibrary("/nonexistent/library.so"));
  EXPECT_EQ(SyslogCapture::Count("not loaded ahead: /nonexistent/library.so"), 1);
}

}  // namespace
}  // namespace QELO
