#include "programs/server/metrics/Page.h"

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <string_view>

#include "programs/server/metrics/Report.h"
#include "webapi/JsonHelper.h"

namespace QELO::MetricsPage {
namespace {

constexpr std::string_view kEnd = "\r\n\r\n";

std::string page(const char* status, const char* type, const std::string& body) {
  return std::string("HTTP/1.0 ") + status + "\r\nContent-Type: " + type +
         "\r\nContent-Length: " + std::to_string(body.size()) +
         "\r\nCache-Control: no-store\r\nConnection: close\r\n\r\n" + body;
}

std::string answer(std::string_view request, const Metrics& metrics) {
  const size_t space = request.find(' ');
  const std::string_view method = request.substr(0, space);
  std::string_view path = space == std::string_view::npos ? "" : request.substr(space + 1);
  path = path.substr(0, path.find_first_of(" ?\r\n"));
  if (method != "GET") {
    return page("405 Method Not Allowed", "text/plain", "Only GET is served.\n");
  }
  if (path == "/metrics") {
    return page("200 OK", "text/plain; version=0.0.4; charset=utf-8", MetricsReport::Text(metrics));
  }
  if (path == "/status") {
    return page("200 OK", "application/json",
                JsonHelper::toString(MetricsReport::Object(metrics)) + "\n");
  }
  return page("404 Not Found", "text/plain", "There are /metrics and /status.\n");
}

}  // namespace

Service::Arrival Take(Connection& connection, const Metrics& metrics) {
  std::string& request = connection.header;
  char piece[kLongest];
  const ssize_t count = TEMP_FAILURE_RETRY(
      recv(connection.socket.Get(), piece, kLongest - request.size(), MSG_DONTWAIT));
  if (count <= 0) {
    return count < 0 && errno == EAGAIN ? Service::Arrival::kMore : Service::Arrival::kMalformed;
  }
  request.append(piece, static_cast<size_t>(count));
  if (request.find(kEnd) != std::string::npos) {
    connection.answer = answer(request, metrics);
    return Service::Arrival::kAnswered;
  }
  return request.size() < kLongest ? Service::Arrival::kMore : Service::Arrival::kTooLarge;
}

}  // namespace QELO::MetricsPage
