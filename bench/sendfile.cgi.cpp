// The yardstick of downloads: a CGI program that sends the file that its query names.

#include <fcntl.h>
#include <sys/sendfile.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>

int main() {
  const char* path = getenv("QUERY_STRING");
  const int file = path != nullptr ? open(path, O_RDONLY | O_CLOEXEC) : -1;
  struct stat info {};
  if (file < 0 || fstat(file, &info) != 0) {
    return 1;
  }
  std::printf("Content-Type: application/octet-stream\r\nContent-Length: %lld\r\n\r\n",
              static_cast<long long>(info.st_size));
  std::fflush(stdout);
  off_t left = info.st_size;
  while (left > 0) {
    const ssize_t count = sendfile(STDOUT_FILENO, file, nullptr, static_cast<size_t>(left));
    if (count <= 0) {
      return 1;
    }
    left -= count;
  }
  return 0;
}
