#include "programs/webapi-server/ScgiHeader.h"

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string_view>

#include "webapi/base/Number.h"

namespace QELO::ScgiHeader {
namespace {

/// Shorter than any header is, so that nothing of a body is read with the header's length.
constexpr size_t kFront = 16;
constexpr size_t kLongestLength = 7;  ///< digits
constexpr std::string_view kFirstName = "CONTENT_LENGTH";
constexpr std::string_view kProtocol = "SCGI";

/// Receives up to a size of the header in all.
/// @return false when nothing more comes at present, or ever: then `arrival` says so
bool receive(Connection& connection, size_t size, Service::Arrival& arrival) {
  std::string& header = connection.header;
  const size_t before = header.size();
  header.resize(size);
  const ssize_t count = TEMP_FAILURE_RETRY(
      recv(connection.socket.Get(), header.data() + before, size - before, MSG_DONTWAIT));
  header.resize(before + static_cast<size_t>(std::max<ssize_t>(count, 0)));
  if (count <= 0) {
    arrival = count < 0 && errno == EAGAIN ? Service::Arrival::kMore : Service::Arrival::kMalformed;
  }
  return count > 0;
}

/// Reads the length in front of the header, once its end is there.
Service::Arrival readLength(Connection& connection) {
  const std::string& header = connection.header;
  const size_t colon = header.find(':');
  if (colon == std::string::npos) {
    return header.size() > kLongestLength ? Service::Arrival::kMalformed : Service::Arrival::kMore;
  }
  size_t length = 0;
  if (colon > kLongestLength || !ParseNumber(std::string_view(header).substr(0, colon), length) ||
      length < kFront) {
    return Service::Arrival::kMalformed;
  }
  if (length > kLongest) {
    return Service::Arrival::kTooLarge;
  }
  connection.wanted = colon + 1 + length + 1;
  return Service::Arrival::kWhole;
}

/// The text up to the next NUL, which is taken off the rest.
char* takeText(char*& rest, const char* end) {
  char* text = rest;
  char* nul = static_cast<char*>(memchr(rest, '\0', static_cast<size_t>(end - rest)));
  rest = nul != nullptr ? nul + 1 : nullptr;
  return nul != nullptr ? text : nullptr;
}

}  // namespace

Service::Arrival Take(Connection& connection) {
  Service::Arrival arrival = Service::Arrival::kMore;
  while (connection.wanted == 0) {
    if (!receive(connection, kFront, arrival)) {
      return arrival;
    }
    const Service::Arrival length = readLength(connection);
    if (length != Service::Arrival::kWhole && length != Service::Arrival::kMore) {
      return length;
    }
  }
  while (connection.header.size() < connection.wanted) {
    if (!receive(connection, connection.wanted, arrival)) {
      return arrival;
    }
  }
  return connection.header.back() == ',' ? Service::Arrival::kWhole : Service::Arrival::kMalformed;
}

bool Parse(std::string& header, std::vector<char*>& environment, int64_t& bodyLength) {
  char* rest = header.data() + header.find(':') + 1;
  const char* end = header.data() + header.size() - 1;
  bool isScgi = false;
  environment.clear();
  while (rest < end) {
    char* name = takeText(rest, end);
    char* value = name != nullptr && rest != nullptr ? takeText(rest, end) : nullptr;
    if (value == nullptr || *name == '\0' || strchr(name, '=') != nullptr ||
        environment.size() >= kMostVariables) {
      return false;
    }
    if (environment.empty() &&
        (name != kFirstName || !ParseNumber(std::string_view(value), bodyLength) ||
         bodyLength < 0)) {
      return false;
    }
    isScgi = isScgi || (name == kProtocol && std::string_view(value) == "1");
    value[-1] = '=';
    environment.push_back(name);
  }
  environment.push_back(nullptr);
  return isScgi;
}

}  // namespace QELO::ScgiHeader
