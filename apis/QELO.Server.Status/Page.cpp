#include "Page.h"

#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>

namespace serverstatus {
namespace {

constexpr size_t kLongest = 65536;
constexpr timeval kPatience{2, 0};
constexpr char kGood[] = "HTTP/1.0 200 ";
constexpr char kHeadEnd[] = "\r\n\r\n";

/// @return none: negative
int Connect(const std::string& path) {
  sockaddr_un address{};
  if (path.empty() || path.size() >= sizeof address.sun_path) {
    return -1;
  }
  address.sun_family = AF_UNIX;
  memcpy(address.sun_path, path.data(), path.size());
  const int connection = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (connection < 0) {
    return -1;
  }
  setsockopt(connection, SOL_SOCKET, SO_RCVTIMEO, &kPatience, sizeof kPatience);
  setsockopt(connection, SOL_SOCKET, SO_SNDTIMEO, &kPatience, sizeof kPatience);
  if (connect(connection, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    close(connection);
    return -1;
  }
  return connection;
}

/// Reads to the end. @return whether there was one
bool ReadAll(int connection, std::string& text) {
  char piece[4096];
  ssize_t count;
  while ((count = recv(connection, piece, sizeof piece, 0)) > 0) {
    text.append(piece, static_cast<size_t>(count));
    if (text.size() > kLongest) {
      return false;
    }
  }
  return count == 0;
}

}  // namespace

Outcome ReadPage(const std::string& socket, const std::string& path, std::string& page) {
  const int connection = Connect(socket);
  if (connection < 0) {
    return Outcome::kNobody;
  }
  const std::string request = "GET " + path + " HTTP/1.0\r\n\r\n";
  std::string answer;
  const bool good = send(connection, request.data(), request.size(), MSG_NOSIGNAL) ==
                        static_cast<ssize_t>(request.size()) &&
                    ReadAll(connection, answer);
  close(connection);
  const size_t headEnd = answer.find(kHeadEnd);
  if (!good || headEnd == std::string::npos || answer.rfind(kGood, 0) != 0) {
    return Outcome::kFailed;
  }
  page = answer.substr(headEnd + strlen(kHeadEnd));
  return Outcome::kRead;
}

}  // namespace serverstatus
