#include "programs/webapi-server/workers/RequestLines.h"

#include <sys/socket.h>

#include <algorithm>
#include <cstring>

#include "programs/entry/RestPath.h"
#include "webapi/base/Number.h"

namespace QELO {
namespace {

constexpr std::string_view kBarred[] = {"__cIpHeR", "__nEkOtReHpIc", "__tXeTrEhPiC",
                                        "relay_zt", "_sharing_",     "tid="};
/// Headers of requests that a front leaves anyway.
constexpr std::string_view kBarredNames[] = {"HTTP_TUS_RESUMABLE", "HTTP_TRANSFER_ENCODING",
                                             "HTTP_X_QELO_ACCESS_TOKEN", "qeloAccessToken"};

std::string_view takeText(std::string_view& rest) {
  const size_t end = std::min(rest.find('\0'), rest.size());
  const std::string_view text = rest.substr(0, end);
  rest.remove_prefix(std::min(end + 1, rest.size()));
  return text;
}

/// Any name may be written so.
bool hasEncodedName(std::string_view line) {
  bool isName = true;
  for (const char c : line) {
    if (isName && (c == '%' || c == '+')) {
      return true;
    }
    isName = c == '&' || (isName && c != '=');
  }
  return false;
}

}  // namespace

RequestLines::RequestLines(std::string_view header) {
  std::string_view rest = header.substr(std::min(header.find(':') + 1, header.size()));
  int64_t length = -1;
  bool isBarred = false;
  std::string_view script;
  std::string_view path;
  while (rest.size() > 1) {
    const std::string_view name = takeText(rest);
    const std::string_view value = takeText(rest);
    if (name == "CONTENT_LENGTH") {
      ParseNumber(value, length);
    } else if (name == "QUERY_STRING") {
      query = value;
    } else if (name == "CONTENT_TYPE") {
      isForm = value.find("multipart") == std::string_view::npos;
    } else if (name == "SCRIPT_NAME") {
      script = value;
    } else if (name == "PATH_INFO") {
      path = value;
    }
    isBarred = isBarred || std::find(std::begin(kBarredNames), std::end(kBarredNames), name) !=
                               std::end(kBarredNames);
  }
  isBarred = isBarred || RestPath::IsAddress(script, path);
  bodyLength = isBarred || !isForm ? -1 : length;
}

bool RequestLines::IsBarred(std::string_view line) const {
  return hasEncodedName(line) ||
         std::any_of(std::begin(kBarred), std::end(kBarred), [&](std::string_view part) {
           return line.find(part) != std::string_view::npos;
         });
}

RequestLines::Body::Body(int socket, int64_t length) : text_(static_cast<size_t>(length), '\0') {
  const ssize_t count = recv(socket, text_.data(), text_.size(), MSG_PEEK | MSG_DONTWAIT);
  text_.resize(static_cast<size_t>(std::max<ssize_t>(count, 0)));
}

RequestLines::Body::~Body() {
  explicit_bzero(text_.data(), text_.size());
}

}  // namespace QELO
