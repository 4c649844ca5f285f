#include "tests/harness/Capture.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>

namespace QELO {
namespace {

constexpr int kFirstOther = 10;  ///< away from the numbers that a call uses
constexpr int kOk = 200;

/// Puts a descriptor in the place of another. @return the other one, kept
int replace(int descriptor, int replacement) {
  const int former = fcntl(descriptor, F_DUPFD_CLOEXEC, kFirstOther);
  dup2(replacement, descriptor);
  close(replacement);
  return former;
}

void giveBack(int descriptor, int former) {
  dup2(former, descriptor);
  close(former);
}

}  // namespace

std::string PrintedBy(const std::function<void()>& call) {
  const int memory = memfd_create("output", MFD_CLOEXEC);
  const int kept = fcntl(memory, F_DUPFD_CLOEXEC, kFirstOther);
  fflush(stdout);
  const int former = replace(STDOUT_FILENO, memory);
  call();
  fflush(stdout);
  giveBack(STDOUT_FILENO, former);
  std::string text(static_cast<size_t>(lseek(kept, 0, SEEK_END)), '\0');
  const ssize_t count = pread(kept, text.data(), text.size(), 0);
  text.resize(static_cast<size_t>(std::max<ssize_t>(0, count)));
  close(kept);
  return text;
}

TestAnswer AnswerOf(const std::string& printed) {
  TestAnswer answer;
  const size_t end = std::min(printed.find("\r\n\r\n"), printed.size());
  answer.body = end < printed.size() ? printed.substr(end + 4) : "";
  answer.status = kOk;
  for (size_t begin = 0; begin < end;) {
    const size_t stop = std::min(printed.find("\r\n", begin), end);
    const std::string line = printed.substr(begin, stop - begin);
    if (line.rfind("Status: ", 0) == 0) {
      answer.status = std::atoi(line.c_str() + sizeof "Status:");
    } else {
      answer.headers.push_back(line);
    }
    begin = stop + 2;
  }
  return answer;
}

Input::Input(const std::string& text) : former_(-1) {
  const int memory = memfd_create("input", MFD_CLOEXEC);
  [[maybe_unused]] const ssize_t count = write(memory, text.data(), text.size());
  lseek(memory, 0, SEEK_SET);
  former_ = replace(STDIN_FILENO, memory);
}

Input::~Input() {
  giveBack(STDIN_FILENO, former_);
}

}  // namespace QELO
