// The fork server's yardstick: with the same libraries loaded it takes one connection after the
// other, forks, prints one object and ends. It reads a request as far as one read goes, and checks
// nothing. Usage: bare_server SOCKET LIBRARY...

#include <dlfcn.h>
#include <json/json.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <string>

#include "webapi/APIRunner.h"

namespace {

void answer(int connection) {
  Json::Value object;
  object["success"] = true;
  object["data"]["user"] = "nobody";
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  const std::string text =
      "Content-Type: application/json\r\n\r\n" + Json::writeString(builder, object);
  char request[65536];
  if (read(connection, request, sizeof request) > 0 &&
      write(connection, text.data(), text.size()) < 0) {
    _exit(1);
  }
  _exit(0);
}

int listenAt(const char* path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  strncpy(address.sun_path, path, sizeof address.sun_path - 1);
  unlink(path);
  const int listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  const bool good = bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0 &&
                    listen(listener, 1024) == 0;
  return good ? listener : -1;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    return 2;
  }
  QELO::APIRunner::RefreshLibraries();  // a symbol of the library's, so that it is linked
  for (int i = 2; i < argc; ++i) {
    if (dlopen(argv[i], RTLD_NOW) == nullptr) {
      fprintf(stderr, "%s\n", dlerror());
      return 1;
    }
  }
  signal(SIGCHLD, SIG_IGN);
  const int listener = listenAt(argv[1]);
  if (listener < 0) {
    perror(argv[1]);
    return 1;
  }
  for (;;) {
    const int connection = accept(listener, nullptr, nullptr);
    const pid_t child = connection < 0 ? -1 : fork();
    if (child == 0) {
      answer(connection);
    }
    close(connection);
  }
}
