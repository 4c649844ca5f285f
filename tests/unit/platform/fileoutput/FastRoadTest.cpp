// Files that the web server sends itself.

#include <sys/stat.h>
#include <unistd.h>

#include "tests/unit/platform/fileoutput/Fixture.h"

namespace QELO {
namespace {

class FastOutput : public FileOutput {
 protected:
  void SetUp() override {
    FileOutput::SetUp();
    setenv("GATEWAY_INTERFACE", "CGI/1.1", 1);
    mkdir(Path("open").c_str(), 0755);
    mkdir(Path("open/d").c_str(), 0755);
    Put("open/a", "0123456789");
    Put("open/d/\u00e4 %.txt", "0123456789");
    Configure();
  }

  static void Configure(const std::string& road = "x-sendfile",
                        const std::string& directories = "/other:/open/") {
    Set({{"fast_output", road}, {"fast_output_dirs", directories}});
  }

  bool IsFast(const std::string& name, const std::map<std::string, std::string>& request = {}) {
    const CgiAnswer answer = Send(name, request);
    const bool isFast = Header(answer, "X-Sendfile") != "(none)";
    EXPECT_EQ(answer.Body().empty(), isFast || request.count("REQUEST_METHOD") > 0);
    EXPECT_EQ(result, 0);
    return isFast;
  }
};

TEST_F(FastOutput, HasTheServerSendTheFile) {
  const CgiAnswer answer = Send("open/a", {}, {"Content-Length: 3"});
  EXPECT_EQ(result, 0);
  EXPECT_EQ(Header(answer, "X-Sendfile"), Path("open/a"));
  EXPECT_EQ(answer.Body(), "");
  EXPECT_EQ(Header(answer, "Content-Length"), "(none)");
  EXPECT_EQ(Header(answer, "Accept-Ranges"), "(none)");
  EXPECT_EQ(Header(answer, "Content-Type"), "text/plain");
  EXPECT_EQ(Header(answer, "X-Content-Type-Options"), "nosniff");
  EXPECT_EQ(Header(answer, "ETag").size(), 18U);
  EXPECT_TRUE(HTTP::FileOutputerHelper::IsFastOutputEnabled());
}

TEST_F(FastOutput, NamesAreEncoded) {
  EXPECT_EQ(Header(Send("open/d/\u00e4 %.txt"), "X-Sendfile"), Path("open/d/%C3%A4%20%25.txt"));
}

TEST_F(FastOutput, RedirectGoesBelowItsLocation) {
  Configure("X-Accel-Redirect");
  EXPECT_EQ(Header(Send("open/a"), "X-Accel-Redirect"), "/webapi-files" + Path("open/a"));
  Set({{"fast_output", "x-accel-redirect"},
       {"fast_output_dirs", "/open"},
       {"fast_output_location", "/inner"}});
  EXPECT_EQ(Header(Send("open/a"), "X-Accel-Redirect"), "/inner" + Path("open/a"));
}

TEST_F(FastOutput, IsOffUnlessItIsConfigured) {
  for (const char* road : {"", "yes", "plain"}) {
    Configure(road);
    EXPECT_FALSE(HTTP::FileOutputerHelper::IsFastOutputEnabled());
    EXPECT_FALSE(IsFast("open/a")) << road;
  }
}

TEST_F(FastOutput, CanBeSwitchedOff) {
  HTTP::FileOutputerHelper::SetFastOutputEnabled(false);
  EXPECT_FALSE(HTTP::FileOutputerHelper::IsFastOutputEnabled());
  EXPECT_FALSE(IsFast("open/a"));
  HTTP::FileOutputerHelper::SetFastOutputEnabled(true);
  EXPECT_TRUE(IsFast("open/a"));
}

TEST_F(FastOutput, IsForTheDirectoriesThatWereNamed) {
  EXPECT_FALSE(IsFast("content"));
  ASSERT_EQ(symlink("../content", Path("open/link").c_str()), 0);
  EXPECT_FALSE(IsFast("open/link"));
  ASSERT_EQ(symlink("open/a", Path("inward").c_str()), 0);
  EXPECT_TRUE(IsFast("inward"));
  mkdir(Path("open2").c_str(), 0755);
  Put("open2/a", "x");
  EXPECT_FALSE(IsFast("open2/a"));
  Configure("x-sendfile", "");
  EXPECT_FALSE(IsFast("open/a"));
  Configure("x-sendfile", ":");
  EXPECT_FALSE(IsFast("open/a"));
}

TEST_F(FastOutput, IsForFilesThatEverybodyMayRead) {
  ASSERT_EQ(chmod(Path("open/a").c_str(), 0640), 0);
  EXPECT_FALSE(IsFast("open/a"));
  EXPECT_TRUE(IsFast("open/d/\u00e4 %.txt"));
  ASSERT_EQ(chmod(Path("open/d").c_str(), 0754), 0);
  EXPECT_FALSE(IsFast("open/d/\u00e4 %.txt"));
}

TEST_F(FastOutput, IsForFilesThatAreStillThere) {
  std::FILE* file = fopen(Path("open/a").c_str(), "re");
  EXPECT_NE(Header(SendStream(file), "X-Sendfile"), "(none)");
  ASSERT_EQ(unlink(Path("open/a").c_str()), 0);
  EXPECT_EQ(Header(SendStream(file), "X-Sendfile"), "(none)");
  Put("open/a", "another");
  EXPECT_EQ(SendStream(file).Body(), "0123456789");
  fclose(file);
}

TEST_F(FastOutput, IsForWholeFilesAndPlainRequests) {
  Put("open/empty", "");
  EXPECT_EQ(Header(Send("open/empty"), "X-Sendfile"), "(none)");
  std::FILE* file = fopen(Path("open/a").c_str(), "re");
  fgetc(file);
  EXPECT_EQ(SendStream(file).Body(), "123456789");
  fclose(file);
  for (const char* condition :
       {"HTTP_RANGE", "HTTP_IF_RANGE", "HTTP_IF_MATCH", "HTTP_IF_NONE_MATCH",
        "HTTP_IF_MODIFIED_SINCE", "HTTP_IF_UNMODIFIED_SINCE"}) {
    EXPECT_FALSE(
        IsFast("open/a", {{condition, condition == std::string("HTTP_IF_MATCH") ? "*" : "x"}}))
        << condition;
  }
  EXPECT_FALSE(IsFast("open/a", {{"REQUEST_METHOD", "HEAD"}}));
  EXPECT_EQ(Header(Send("open/a", {{"REQUEST_METHOD", "POST"}}), "X-Sendfile"), "(none)");
  EXPECT_EQ(Header(Send("open/a", {}, {"Status: 404"}), "X-Sendfile"), "(none)");
  unsetenv("GATEWAY_INTERFACE");
  EXPECT_FALSE(IsFast("open/a"));
}

TEST_F(FastOutput, NamesThatAreNoUtf8AreNotHandedOver) {
  Put("open/\xff", "0123456789");
  EXPECT_FALSE(IsFast("open/\xff"));
}

}  // namespace
}  // namespace QELO
