#include <string>
#include <string_view>

#include "platform/base/TextBuffer.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Token.h"
#include "webapi/platform/WebAPIUtil.h"

namespace {

bool isEnciphered(std::string_view line) {
  while (!line.empty()) {
    const size_t end = line.find('&');
    const std::string_view pair = line.substr(0, end);
    line.remove_prefix(end == std::string_view::npos ? line.size() : end + 1);
    const std::string name(pair.substr(0, pair.find('=')));
    if (QELO::WebAPIUtil::URLDecode(name, true) == "__cIpHeRtExT") {
      return true;
    }
  }
  return false;
}

}  // namespace

extern "C" {

// This platform serves no cipher: an enciphered line is a failure, which the caller reports.
int QeloCgiDetectAndDecryptParamLine(char* line) {
  return line == nullptr || isEnciphered(line) ? 0 : 1;
}

// No cipher is served; the caller reports the failure.
int QeloCgiDecryptParam(char*) {
  return 0;
}

// No cipher is served, so there is no key to derive; the caller reports the failure.
int QELOCloudServiceZttokenGenerateToken(const char*, char* key, int size) {
  QELO::Platform::fillBuffer("", key, size);
  return -1;
}

}  // extern "C"

// No cipher is served; the caller reports the failure.
bool QELO::CredRequestUtil::GetDecryptAESString(const std::string&, const std::string&,
                                                std::string&) {
  return false;
}
