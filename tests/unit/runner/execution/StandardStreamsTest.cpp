#include <fcntl.h>
#include <stdio_ext.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>
#include <iostream>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class Streams : public RunnerTest {
 protected:
  /// What a call of the plugin leaves on descriptor 1 when "input" can be read from descriptor 0.
  std::string Output(const std::string& plugin, const std::string& attributes, int version = 1) {
    const std::string path = (directory / "output").string();
    const int output = open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0600);
    Write((directory / "input").string(), "input input");
    const int input = open((directory / "input").c_str(), O_RDONLY);
    std::cout.flush();
    fflush(stdout);
    const int formerOutput = dup(1);
    const int formerInput = dup(0);
    dup2(output, 1);
    dup2(input, 0);
    printf("before ");
    ProcessPlugin(plugin, attributes, version);
    char left[6] = {};
    EXPECT_GE(read(0, left, 5), 0);
    inputAfter = left;
    printf(" after");
    fflush(stdout);
    dup2(formerOutput, 1);
    dup2(formerInput, 0);
    for (const int fd : {output, input, formerOutput, formerInput}) {
      close(fd);
    }
    std::ifstream file(path);
    return std::string(std::istreambuf_iterator<char>(file), {});
  }
  std::string inputAfter;  ///< the first bytes that could be read after the call
};

TEST_F(Streams, WhatAMethodPrintsGoesNowhere) {
  EXPECT_EQ(Output("printing", "{}"), "before  after");
  EXPECT_EQ(Data(), Json::Value("printed"));
}

TEST_F(Streams, ComeBackAfterALibraryThatCannotBeUsed) {
  std::streambuf* const output = std::cout.rdbuf();
  std::streambuf* const input = std::cin.rdbuf();
  EXPECT_EQ(Output("no_table", "{}"), "before  after");
  EXPECT_EQ(response->GetError(), 111);
  EXPECT_EQ(inputAfter, "input");
  EXPECT_EQ(std::cout.rdbuf(), output);
  EXPECT_EQ(std::cin.rdbuf(), input);
}

TEST_F(Streams, ComeBackAfterAMethodThatIsMissing) {
  std::streambuf* const output = std::cout.rdbuf();
  std::streambuf* const input = std::cin.rdbuf();
  EXPECT_EQ(Output("state", "{}", 2), "before  after");
  EXPECT_EQ(response->GetError(), 121);
  EXPECT_EQ(inputAfter, "input");
  EXPECT_EQ(std::cout.rdbuf(), output);
  EXPECT_EQ(std::cin.rdbuf(), input);
}

TEST_F(Streams, DownloadMethodPrints) {
  const std::string output = Output("printing", R"({"allowDownload": true})");
  for (const char* way : {"<C++ stream>", "<C stream>", "<descriptor>"}) {
    EXPECT_NE(output.find(way), std::string::npos) << way << " in " << output;
  }
}

TEST_F(Streams, MethodReadsEndOfFileAtOnce) {
  Output("reading", "{}");
  EXPECT_EQ(Data(), Parse(R"({"stream": "", "file": 0, "descriptor": 0})"));
}

/// In a process of its own, whose streams nothing else has used.
int inChild(const std::function<bool()>& succeeds) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(succeeds() ? 0 : 1);
  }
  int status = -1;
  waitpid(child, &status, 0);
  return status;
}

TEST_F(Streams, MethodReadsNothingOfWhatTheProcessHasReadAhead) {
  Write((directory / "words").string(), "first second third");
  for (const bool synchronised : {true, false}) {
    EXPECT_EQ(inChild([&] {
                std::ios::sync_with_stdio(synchronised);
                const int words = open((directory / "words").c_str(), O_RDONLY);
                dup2(words, 0);
                __fpurge(stdin);  // what tests before this one have left
                clearerr(stdin);
                std::cin.clear();
                std::string former;
                std::string next;
                std::cin >> former;
                ProcessPlugin("reading", "{}");
                std::cin >> next;
                return former == "first" && next == "second" &&
                       Data() == Parse(R"({"stream": "", "file": 0, "descriptor": 0})");
              }),
              0)
        << synchronised;
  }
}

TEST_F(Streams, UploadMethodReadsTheInput) {
  Output("reading", R"({"allowUpload": true})");
  EXPECT_EQ(Data()["stream"], Json::Value("input"));
}

}  // namespace
}  // namespace QELO
