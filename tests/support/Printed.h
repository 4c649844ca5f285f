#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "webapi/JsonHelper.h"

namespace QELO {

/// A descriptor that stands in for another one while it lives.
class Redirection {
 public:
  /// @param replacement  its owner stays the caller
  Redirection(int descriptor, int replacement)
      : descriptor_(descriptor), former_(fcntl(descriptor, F_DUPFD_CLOEXEC, 10)) {
    dup2(replacement, descriptor);
  }
  Redirection(const Redirection&) = delete;
  Redirection& operator=(const Redirection&) = delete;
  ~Redirection() {
    dup2(former_, descriptor_);
    close(former_);
  }

 private:
  int descriptor_;
  int former_;
};

/// What was printed as a CGI answer.
struct CgiAnswer {
  std::string text;

  std::string Head() const { return text.substr(0, text.find("\r\n\r\n")); }
  std::string Body() const {
    const size_t end = text.find("\r\n\r\n");
    return end == std::string::npos ? "" : text.substr(end + 4);
  }
  bool HasLine(const std::string& line) const {
    return ("\r\n" + Head() + "\r\n").find("\r\n" + line + "\r\n") != std::string::npos;
  }
  Json::Value Json() const {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(Body(), value)) << text;
    return value;
  }
  int Code() const { return JsonHelper::asInt(JsonHelper::member(Json()["error"], "code")); }
};

/// What a call prints to standard output.
template <typename Call>
CgiAnswer PrintedBy(Call call) {
  const int fd = memfd_create("output", MFD_CLOEXEC);
  {
    fflush(stdout);
    const Redirection output(STDOUT_FILENO, fd);
    call();
    fflush(stdout);
  }
  CgiAnswer answer;
  answer.text.resize(static_cast<size_t>(lseek(fd, 0, SEEK_END)));
  EXPECT_EQ(pread(fd, answer.text.data(), answer.text.size(), 0),
            static_cast<ssize_t>(answer.text.size()));
  close(fd);
  return answer;
}

}  // namespace QELO
