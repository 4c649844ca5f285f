// One upload without a web server: what it takes of memory.
//
//   upload_bench PROGRAM BYTES   runs the program, with the CGI variables of its environment and
//   those
//                                of a form with one file of so many bytes, which comes by a pipe
//
// Prints its peak memory in KiB.

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>

extern char** environ;

namespace {

constexpr std::string_view kHead =
    "--B\r\nContent-Disposition: form-data; name=\"f\"; filename=\"x\"\r\n\r\n";
constexpr std::string_view kTail = "\r\n--B--\r\n";

bool put(int pipe, std::string_view text) {
  while (!text.empty()) {
    const ssize_t count = write(pipe, text.data(), text.size());
    if (count <= 0) {
      return false;
    }
    text.remove_prefix(static_cast<size_t>(count));
  }
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  int ends[2];
  if (argc != 3 || pipe2(ends, O_CLOEXEC) != 0) {
    return 2;
  }
  unsigned long long left = strtoull(argv[2], nullptr, 10);
  setenv("CONTENT_LENGTH", std::to_string(left + kHead.size() + kTail.size()).c_str(), 1);
  setenv("CONTENT_TYPE", "multipart/form-data; boundary=B", 1);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, ends[0], STDIN_FILENO);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  char* arguments[] = {argv[1], nullptr};
  pid_t child = 0;
  if (posix_spawn(&child, argv[1], &actions, nullptr, arguments, environ) != 0) {
    return 1;
  }
  close(ends[0]);
  const std::string piece(1 << 20, 'x');
  bool good = put(ends[1], kHead);
  while (good && left > 0) {
    const size_t size = static_cast<size_t>(std::min<unsigned long long>(left, piece.size()));
    good = put(ends[1], std::string_view(piece).substr(0, size));
    left -= size;
  }
  good = good && put(ends[1], kTail);
  close(ends[1]);
  int status = 0;
  rusage usage{};
  if (wait4(child, &status, 0, &usage) != child || status != 0 || !good) {
    return 1;
  }
  std::printf("%ld\n", usage.ru_maxrss);
  return 0;
}
