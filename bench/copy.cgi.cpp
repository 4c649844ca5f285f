// The yardstick of uploads: a CGI program that copies its standard input to a file, and removes it.

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <vector>

int main() {
  const char* path = WEBAPI_ROOT_PREFIX "/tmp/copied";
  const int file = open(path, O_WRONLY | O_CREAT | O_TRUNC, 0600);
  std::vector<char> buffer(256 << 10);
  unsigned long long copied = 0;
  ssize_t count = 0;
  while ((count = read(STDIN_FILENO, buffer.data(), buffer.size())) > 0) {
    if (write(file, buffer.data(), static_cast<size_t>(count)) != count) {
      return 1;
    }
    copied += static_cast<unsigned long long>(count);
  }
  close(file);
  unlink(path);
  std::printf("Content-Type: application/json\r\n\r\n{\"success\":true,\"size\":%llu}", copied);
  return 0;
}
