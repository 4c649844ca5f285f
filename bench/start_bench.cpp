// Measures how long a client waits for the answer to the start of a background task.
// Usage: start_bench SECONDS PORT SESSION DIRECTORY
//   Starts QELO.Work.Checksum on DIRECTORY as the user of SESSION, over and over, and removes each
//   task. Prints the median of the starts in milliseconds, from the connection to its end.

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>
#include <webapi/JsonHelper.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

namespace JsonHelper = QELO::JsonHelper;
using Clock = std::chrono::steady_clock;

/// The whole answer to a POST of a form, "" when the server does not answer.
std::string post(int port, const std::string& form) {
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  const std::string request =
      "POST /webapi/entry.cgi HTTP/1.0\r\nHost: 127.0.0.1\r\n"
      "Content-Type: application/x-www-form-urlencoded\r\nContent-Length: " +
      std::to_string(form.size()) + "\r\n\r\n" + form;
  std::string answer;
  if (connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
      write(fd, request.data(), request.size()) == static_cast<ssize_t>(request.size())) {
    char buffer[4096];
    ssize_t count = 0;
    while ((count = read(fd, buffer, sizeof buffer)) > 0) {
      answer.append(buffer, static_cast<size_t>(count));
    }
  }
  close(fd);
  return answer;
}

/// @return the task's id, "" when it was not started
std::string taskOf(const std::string& answer) {
  const size_t head = answer.find("\r\n\r\n");
  Json::Value body;
  if (head == std::string::npos || !JsonHelper::fromString(answer.substr(head + 4), body)) {
    return "";
  }
  return JsonHelper::asString(JsonHelper::member(JsonHelper::member(body, "data"), "task_id"));
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    fprintf(stderr, "usage: start_bench SECONDS PORT SESSION DIRECTORY\n");
    return 2;
  }
  const auto end = Clock::now() + std::chrono::duration<double>(strtod(argv[1], nullptr));
  const int port = static_cast<int>(strtol(argv[2], nullptr, 10));
  const std::string session = std::string("&version=1&_sid=") + argv[3];
  std::vector<double> times;
  do {
    const auto start = Clock::now();
    const std::string answer = post(
        port, "api=QELO.Work.Checksum&method=start" + session + "&path=" + std::string(argv[4]));
    times.push_back(std::chrono::duration<double, std::milli>(Clock::now() - start).count());
    const std::string task = taskOf(answer);
    if (task.empty()) {
      fprintf(stderr, "no task: %s\n", answer.c_str());
      return 1;
    }
    post(port, "api=QELO.Work.Task&method=stop&remove=true" + session + "&task_id=" + task);
  } while (Clock::now() < end);
  std::nth_element(times.begin(), times.begin() + static_cast<long>(times.size() / 2), times.end());
  printf("%.2f\n", times[times.size() / 2]);
  return 0;
}
