// What is left of a request's body when nobody has read it.

#include "webapi/entry/intake/UnreadBody.h"

#include <sys/socket.h>
#include <sys/wait.h>

#include <chrono>

#include "tests/support/CgiFixture.h"
#include "webapi/base/TakenBody.h"

namespace QELO {
namespace {

constexpr size_t kMuch = 4 << 20;  // more than any pipe or socket holds

class Unread : public CgiTest {
 protected:
  /// Standard input is one end of a pipe.
  void GivePipe() {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    dup2(ends[0], STDIN_FILENO);
    close(ends[0]);
    writer = ends[1];
  }
  void TearDown() override {
    if (writer >= 0) {
      close(writer);
    }
    CgiTest::TearDown();
  }
  void Send(const std::string& text) const {
    EXPECT_EQ(write(writer, text.data(), text.size()), static_cast<ssize_t>(text.size()));
  }

  int writer = -1;
};

TEST_F(Unread, IsDroppedToTheAnnouncedLengthAndNotWaitedForBeyond) {
  GivePipe();
  Send("12345rest");
  UnreadBody body(STDIN_FILENO, 5);
  EXPECT_TRUE(body.IsOpen());
  body.Drop();
  EXPECT_FALSE(body.IsOpen());
  close(writer);
  writer = -1;
  EXPECT_EQ(RestOfInput(), "rest");
}

TEST_F(Unread, IsWhatOthersHaveLeft) {
  GivePipe();
  Send("12345rest");
  UnreadBody body(STDIN_FILENO, 5);
  char taken[3];
  ASSERT_EQ(read(STDIN_FILENO, taken, sizeof taken), 3);
  TakenBodyBytes() += 3;
  body.Drop();
  EXPECT_FALSE(body.IsOpen());
  EXPECT_TRUE(UnreadBody(STDIN_FILENO, 1).IsOpen());  // a body of its own
  close(writer);
  writer = -1;
  EXPECT_EQ(RestOfInput(), "rest");
}

TEST_F(Unread, OfUnknownLengthIsDroppedToItsEnd) {
  GivePipe();
  Send("12345");
  close(writer);
  writer = -1;
  UnreadBody body(STDIN_FILENO, -1);
  body.Drop();
  EXPECT_FALSE(body.IsOpen());
}

TEST_F(Unread, OfAClientThatStallsIsGivenUp) {
  GivePipe();
  Send("123");
  UnreadBody body(STDIN_FILENO, 5);
  const auto start = std::chrono::steady_clock::now();
  body.Drop();
  EXPECT_GE(std::chrono::steady_clock::now() - start, UnreadBody::kIdleLimit);
  EXPECT_TRUE(body.IsOpen());
}

TEST_F(Unread, IsNotLookedForWhereNothingOrNobodyIs) {
  EXPECT_FALSE(UnreadBody(STDIN_FILENO, 5).IsOpen());  // a file
  GivePipe();
  EXPECT_FALSE(UnreadBody(STDIN_FILENO, 0).IsOpen());
  EXPECT_FALSE(UnreadBody(-1, 5).IsOpen());
}

TEST_F(Unread, IsLeftAloneWhenItsDescriptorLeadsElsewhere) {
  GivePipe();
  Send("12345");
  UnreadBody body(STDIN_FILENO, 5);
  GiveInput("a method's own");
  EXPECT_FALSE(body.IsOpen());
  body.Drop();
  EXPECT_EQ(RestOfInput(), "a method's own");
}

TEST_F(Unread, IsAnnouncedByTheCgiVariables) {
  GivePipe();
  EXPECT_FALSE(UnreadBody::OfRequest().IsOpen());
  for (const char* none : {"", "0", "-5", "x"}) {
    Set("CONTENT_LENGTH", none);
    EXPECT_FALSE(UnreadBody::OfRequest().IsOpen()) << none;
  }
  Set("CONTENT_LENGTH", "5");
  EXPECT_TRUE(UnreadBody::OfRequest().IsOpen());
  unsetenv("CONTENT_LENGTH");
  Set("HTTP_TRANSFER_ENCODING", "chunked");
  EXPECT_TRUE(UnreadBody::OfRequest().IsOpen());
  unsetenv("HTTP_TRANSFER_ENCODING");
}

/// As a server that passes the whole body on before it takes the answer, by one socket, and has no
/// answer when that fails.
CgiAnswer throughASocket(size_t bodySize) {
  int ends[2];
  EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
  fflush(nullptr);
  const pid_t program = fork();
  if (program == 0) {
    dup2(ends[1], STDIN_FILENO);
    dup2(ends[1], STDOUT_FILENO);
    close(ends[0]);
    close(ends[1]);
    TestEntry().Run(Json::Value());
    _exit(0);
  }
  close(ends[1]);
  const std::string body(bodySize, 'x');
  ssize_t count = 0;
  for (size_t sent = 0; sent < body.size() && count >= 0; sent += static_cast<size_t>(count)) {
    count = send(ends[0], body.data() + sent, body.size() - sent, MSG_NOSIGNAL);
  }
  const bool passed = count >= 0;
  shutdown(ends[0], SHUT_WR);
  waitpid(program, nullptr, 0);
  CgiAnswer answer;
  char buffer[4096];
  while (passed && (count = recv(ends[0], buffer, sizeof buffer, 0)) > 0) {
    answer.text.append(buffer, static_cast<size_t>(count));
  }
  close(ends[0]);
  return answer;
}

TEST_F(Unread, TakesNoAnswerAlong) {
  Describe(R"({"authLevel": 0})");
  struct Case {
    const char *verb, *query, *type;
    size_t length;
    int code;
  };
  for (const auto& [verb, query, type, length, code] : {
           Case{"GET", "api=QELO.Test.Good&version=1&method=echo", "", kMuch, 0},
           Case{"PUT", "api=QELO.Test.Good&version=1&method=fail", "", kMuch, 400},
           Case{"POST", "", "application/x-www-form-urlencoded", size_t{17} << 20, 101},
           Case{"POST", "", "multipart/form-data; boundary=b", kMuch, 101},
           Case{"POST", "api=QELO.Test.Good&version=1&method=echo",
                "multipart/form-data; boundary=b", kMuch, 115},
           Case{"POST", "api=QELO.Test.Good&version=1&method=echo",
                "multipart/form-data; boundary=b", 1, 115},
       }) {
    Set("REQUEST_METHOD", verb);
    Set("QUERY_STRING", query);
    Set("CONTENT_TYPE", type);
    Set("CONTENT_LENGTH", std::to_string(length));
    EXPECT_EQ(throughASocket(length).Code(), code) << verb << ' ' << type;
  }
  unsetenv("CONTENT_LENGTH");
  Set("CONTENT_TYPE", "application/x-www-form-urlencoded");
  Set("HTTP_TRANSFER_ENCODING", "chunked");
  EXPECT_EQ(throughASocket(kMuch).Code(), 101);
  unsetenv("HTTP_TRANSFER_ENCODING");
}

}  // namespace
}  // namespace QELO
