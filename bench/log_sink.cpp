// Stands in for the syslog daemon on a host that has none: without one, each message goes to the
// console instead, which takes longer than the rest of a request.
//
//   log_sink PATH   serves PATH until it is ended

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdio>

int main(int argc, char** argv) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (argc != 2 || snprintf(address.sun_path, sizeof address.sun_path, "%s", argv[1]) >=
                       static_cast<int>(sizeof address.sun_path)) {
    std::fprintf(stderr, "usage: log_sink PATH\n");
    return 2;
  }
  const int sink = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  if (sink < 0 || bind(sink, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
      chmod(argv[1], 0666) != 0) {
    std::perror(argv[1]);
    return 1;
  }
  char message[8192];
  while (recv(sink, message, sizeof message, 0) >= 0) {
  }
  return 0;
}
