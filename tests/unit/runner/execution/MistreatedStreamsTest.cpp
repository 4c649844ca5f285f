// What a method may leave of the process's streams, and what those who come after it find.

#include <fcntl.h>
#include <stdio_ext.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cwchar>
#include <iostream>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

/// Each test runs in a child, whose streams nobody else needs, and prints there to "output".
class MistreatedStreams : public RunnerTest, public testing::WithParamInterface<const char*> {
 protected:
  /// One call of the method, after which its library is unloaded. @return whether it was made
  bool Call(const std::string& how) {
    WriteDescription(Description("mistreating"));
    Json::Value params;
    params["how"] = how;
    MakeRequest("QELO.Test.Call", 1, "run", params);
    runner = std::make_unique<TestRunner>();
    const bool called = runner->Process(request.get(), response.get());
    runner.reset();
    return called;
  }

  /// Runs the body with "input input" to read, in a child that ends as programs do.
  /// @return its exit status
  template <typename Body>
  int InChild(Body body) {
    Write((directory / "input").string(), "input input");
    fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
      dup2(open((directory / "input").c_str(), O_RDONLY), STDIN_FILENO);
      dup2(open((directory / "output").c_str(), O_RDWR | O_CREAT, 0600), STDOUT_FILENO);
      __fpurge(stdin);  // what tests before this one have left
      clearerr(stdin);
      std::cin.clear();
      body();
      fflush(stdout);
      for (std::ostream* stream : {&std::cout, &std::cerr, &std::clog}) {
        stream->flush();  // as the end of a program does
      }
      for (std::wostream* stream : {&std::wcout, &std::wcerr, &std::wclog}) {
        stream->flush();
      }
      _exit(failures);
    }
    int status = -1;
    waitpid(child, &status, 0);
    return status;
  }

  void Expect(bool condition) { failures += condition ? 0 : 1; }

  std::string Printed() const {
    std::ifstream file(directory / "output");
    return std::string(std::istreambuf_iterator<char>(file), {});
  }

  int failures = 0;
};

TEST_P(MistreatedStreams, AreWholeAfterOneCall) {
  EXPECT_EQ(InChild([&] {
              Expect(Call(GetParam()));
              printf("C ");
              fflush(stdout);
              std::cout << "C++" << std::flush;
              std::string word;
              std::cin >> word;
              Expect(word == "input");
              char rest[8] = {};
              Expect(fread(rest, 1, 6, stdin) == 6 && std::string(rest) == " input");
            }),
            0);
  EXPECT_EQ(Printed(), "C C++");
}

TEST_P(MistreatedStreams, AreWholeAfterTwoCallsAndForWideText) {
  EXPECT_EQ(InChild([&] {
              Expect(Call(GetParam()) && Call(GetParam()));
              std::wcout << L"wide" << std::flush;
            }),
            0);
  EXPECT_EQ(Printed(), "wide");
}

INSTANTIATE_TEST_SUITE_P(Ways, MistreatedStreams,
                         testing::Values("closed", "descriptors", "wide", "wideCpp", "reopened",
                                         "lent", "dead", "tied", "throwing", "unsynchronised",
                                         "replaced"),
                         [](const auto& way) { return std::string(way.param); });

TEST_F(MistreatedStreams, KeepTheirBuffersErrorsAndTies) {
  EXPECT_EQ(InChild([&] {
              std::streambuf* const buffer = std::cout.rdbuf();
              std::cin.setstate(std::ios::eofbit);
              std::clog.exceptions(std::ios::badbit);
              for (const char* how : {"dead", "tied", "throwing", "wideCpp"}) {
                Expect(Call(how));
                Expect(std::cout.rdbuf() == buffer && std::cout.exceptions() == std::ios::goodbit);
                Expect(std::cin.tie() == &std::cout && std::cout.tie() == nullptr);
                Expect(std::cin.rdstate() == std::ios::eofbit);
                Expect(std::clog.exceptions() == std::ios::badbit);
              }
            }),
            0);
}

TEST_F(MistreatedStreams, LostWithTheDescriptorsThatWereKept_AreLoggedAndNotTakenForOthers) {
  EXPECT_EQ(InChild([&] {
              Expect(Call("rest"));
              Expect(SyslogCapture::Count("standard output is lost, and the answer: foreign code "
                                          "closed its descriptor") == 1);
              Expect(SyslogCapture::Count("standard input is lost: foreign code closed its "
                                          "descriptor") == 1);
              Expect(SyslogCapture::Count("cannot go back to the working directory: foreign "
                                          "code closed its descriptor") == 1);
              printf("nowhere");
              Expect(fflush(stdout) == 0);  // the method's own files are always full
              Expect(getchar() == EOF);
            }),
            0);
  EXPECT_EQ(Printed(), "");
}

}  // namespace
}  // namespace QELO
