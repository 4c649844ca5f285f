#include "webapi/entry/ProcessGuard.h"

#include <unistd.h>

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <string>
#include <string_view>

#include "webapi/platform/Cgi.h"

namespace QELO {
namespace {

constexpr unsigned kFirstInherited = 3;
constexpr std::string_view kProxyHeader = "HTTP_PROXY";
constexpr char kPath[] = "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin";
constexpr std::string_view kPrefixes[] = {"HTTP_", "LC_", "QELO_"};
/// In alphabetical order.
constexpr std::string_view kNames[] = {"AUTH_TYPE",
                                       "CONTENT_LENGTH",
                                       "CONTENT_TYPE",
                                       "DOCUMENT_ROOT",
                                       "GATEWAY_INTERFACE",
                                       "HOST",
                                       "HTTPS",
                                       "LANG",
                                       "PATH_INFO",
                                       "PATH_TRANSLATED",
                                       "QUERY_STRING",
                                       "REDIRECT_STATUS",
                                       "REMOTE_ADDR",
                                       "REMOTE_HOST",
                                       "REMOTE_IDENT",
                                       "REMOTE_PORT",
                                       "REMOTE_USER",
                                       "REQUEST_METHOD",
                                       "REQUEST_SCHEME",
                                       "REQUEST_URI",
                                       "REWRITE_APP",
                                       "SCRIPT_FILENAME",
                                       "SCRIPT_NAME",
                                       "SERVER_ADDR",
                                       "SERVER_NAME",
                                       "SERVER_PORT",
                                       "SERVER_PROTOCOL",
                                       "SERVER_SOFTWARE",
                                       "TZ",
                                       "USERNAME",
                                       "full_task_id",
                                       "in_qeloapid",
                                       "qeloAccessToken",
                                       "task_id",
                                       "task_user"};

bool isKept(std::string_view name) {
  static_assert(std::is_sorted(std::begin(kNames), std::end(kNames)));
  if (name == kProxyHeader) {
    return false;
  }
  const auto begins = [name](std::string_view prefix) { return name.starts_with(prefix); };
  return std::any_of(std::begin(kPrefixes), std::end(kPrefixes), begins) ||
         std::binary_search(std::begin(kNames), std::end(kNames), name) ||
         QeloCgiKeepsVariable(std::string(name).c_str()) == 1;
}

}  // namespace

void CloseInheritedDescriptors() {
  close_range(kFirstInherited, UINT_MAX, 0);
}

void CleanEnvironment() {
  char** end = environ;
  for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
    const std::string_view text = *entry;
    const size_t equals = text.find('=');
    if (equals != std::string_view::npos && isKept(text.substr(0, equals))) {
      *end++ = *entry;
    }
  }
  if (end != nullptr) {
    *end = nullptr;
  }
  setenv("PATH", kPath, 1);
}

}  // namespace QELO
