// The memory that a request costs before anybody was asked anything: the CGI program is given
// bodies that no honest client sends, each as large as a body may be or as its values may be many.
//
//   intake_bench PROGRAM DIR   the CGI program; DIR takes the body that is being sent
//
// Prints a line for each body: its name, its KiB, the peak resident memory of the program in KiB
// and the error code of its answer (0: none).
//
// A program counts what its parent had in memory when it was started, so bodies are written piece
// by piece, and never held here.

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

constexpr size_t kLongest = 16 << 20;

/// One body: front, as many pieces as fit, back.
struct Body {
  const char* name;
  const char* front;
  const char* piece;
  const char* back = "";
  size_t pieces = SIZE_MAX;
};

constexpr char kCall[] = "api=QELO.Access.Session&version=1&method=current&a=";
constexpr size_t kAlmostTooMany = 49'900;      // values
constexpr size_t kAlmostTooManyPairs = 9'900;  // parameters
constexpr char kCompound[] =
    "api=QELO.Entry.Request&version=1&method=request&mode=parallel&compound=";
constexpr size_t kAlmostTooManyEntries = 250;  // of an anonymous compound request

const std::string kLongPiece = '"' + std::string(330, 'x') + "\",";
const std::string kLongEntry =
    R"({"api":"QELO.Access.Session","version":1,"method":"current","a":")" +
    std::string(65'000, 'x') + "\"},";
const std::string kLongEscapes = "\"\\u0041" + std::string(320, 'x') + "\",";

const Body kBodies[] = {
    {"zeros", "a=[0", ",0", "]"},
    {"reals", "a=[0", ",0.5", "]"},
    {"empty-arrays", "a=[0", ",[]", "]"},
    {"empty-objects", "a=[0", ",{}", "]"},
    {"nested-arrays", "a=[0", ",[[[[[[[]]]]]]]", "]"},
    {"nested-objects", "a=[0", ",{\"a\":{\"b\":{}}}", "]"},
    {"encoded-arrays", "a=%5b0", "%2c%5b%5d", "%5d"},
    {"deep", "a=", "["},
    {"parameters", "a=1", "&a=1"},
    {"empty-parameters", "a", "&a"},
    {"array-parameters", "a=1", "&a=[]"},
    {"text", kCall, "x"},
    {"string", "a=\"", "x", "\""},
    {"escapes", "a=\"", "\\n", "\""},
    {"code-points", "a=\"", "\\u00e9", "\""},
    {"no-json", "a=[\"", "\\n", "\"x"},
    {"percent", "a=", "%41"},
    {"percent-string", "a=%22", "%41", "%22"},
    {"digits", "a=", "1"},
    {"fraction", "a=0.", "1"},
    {"blanks", "a=", "+"},
    {"name", "", "x", "=1"},
    {"object-name", "a={\"", "x", "\":1}"},
    {"api", "version=1&method=get&api=", "x"},
    {"api-dots", "version=1&method=get&api=a", ".a"},
    {"method", "api=QELO.Access.Session&version=1&method=", "x"},
    {"session", "api=QELO.Access.Session&version=1&method=current&_sid=", "x"},
    {"token", "api=QELO.Access.Session&version=1&method=current&tid=", "x"},
    {"sharing", "api=QELO.Access.Session&version=1&method=current&_sharing_id=", "x"},
    {"cipher", "webapi={\"__cIpHeRtExT\":\"", "x", "\"}"},
    {"strings", kCall, kLongPiece.c_str(), "0]", kAlmostTooMany},
    {"string-escapes", kCall, kLongEscapes.c_str(), "0]", kAlmostTooMany},
    {"most-zeros", kCall, "0,", "0]", kAlmostTooMany},
    {"most-objects", kCall, "{\"abcdefghijklmnopqrstuvwxyz\":[]},", "0]", kAlmostTooMany / 2},
    {"compound", kCompound, "0,", "0]"},
    {"compound-nested", kCompound, "{\"compound\":[0]},", "0]"},
    {"compound-values", kCompound, "0,", "0]", kAlmostTooMany},
    {"compound-entries", kCompound, kLongEntry.c_str(), "0]", kAlmostTooManyEntries},
    {"most-parameters", "a=1", "&a=1", "", kAlmostTooManyPairs},
};

[[noreturn]] void fail(const char* what) {
  std::perror(what);
  std::exit(1);
}

/// Writes a body. @return its size
size_t write(const Body& body, const std::string& path) {
  FILE* file = std::fopen(path.c_str(), "w");
  if (file == nullptr) {
    fail(path.c_str());
  }
  std::string front = body.front;
  front += *body.back == '0' ? "[" : "";
  const size_t length = std::strlen(body.piece);
  size_t size = front.size() + std::strlen(body.back);
  std::fputs(front.c_str(), file);
  for (size_t i = 0; i < body.pieces && size + length <= kLongest; ++i, size += length) {
    std::fputs(body.piece, file);
  }
  std::fputs(body.back, file);
  if (std::fclose(file) != 0) {
    fail(path.c_str());
  }
  return size;
}

/// Reads an answer to its end. @return the error code in its first part
int readCode(int fd) {
  char text[4097] = "";
  char rest[4096];
  ssize_t count = 0;
  for (size_t size = 0;
       size < sizeof text - 1 && (count = read(fd, text + size, sizeof text - 1 - size)) > 0;) {
    size += static_cast<size_t>(count);
  }
  while (count > 0) {
    count = read(fd, rest, sizeof rest);
  }
  const char* code = std::strstr(text, "\"code\":");
  return std::strstr(text, "\r\n\r\n{") == nullptr ? -1 : code == nullptr ? 0 : std::atoi(code + 7);
}

void measure(const char* program, const Body& body, const std::string& path) {
  const size_t size = write(body, path);
  const std::string length = "CONTENT_LENGTH=" + std::to_string(size);
  char* environment[] = {const_cast<char*>("REQUEST_METHOD=POST"),
                         const_cast<char*>("REMOTE_ADDR=127.0.0.1"),
                         const_cast<char*>("CONTENT_TYPE=application/x-www-form-urlencoded"),
                         const_cast<char*>(length.c_str()), nullptr};
  char* arguments[] = {const_cast<char*>(program), nullptr};
  int answer[2];
  if (pipe2(answer, O_CLOEXEC) != 0) {
    fail("pipe");
  }
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, path.c_str(), O_RDONLY, 0);
  posix_spawn_file_actions_adddup2(&actions, answer[1], STDOUT_FILENO);
  pid_t child = 0;
  if (posix_spawn(&child, program, &actions, nullptr, arguments, environment) != 0) {
    fail(program);
  }
  close(answer[1]);
  const int code = readCode(answer[0]);
  close(answer[0]);
  int status = 0;
  rusage usage{};
  if (wait4(child, &status, 0, &usage) != child || status != 0) {
    std::fprintf(stderr, "%s: %s ended with status %d\n", body.name, program, status);
    std::exit(1);
  }
  posix_spawn_file_actions_destroy(&actions);
  std::printf("%s %zu %ld %d\n", body.name, size / 1024, usage.ru_maxrss, code);
  std::fflush(stdout);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: intake_bench PROGRAM DIR\n");
    return 2;
  }
  const std::string path = std::string(argv[2]) + "/body";
  for (const Body& body : kBodies) {
    measure(argv[1], body, path);
  }
  unlink(path.c_str());
  return 0;
}
