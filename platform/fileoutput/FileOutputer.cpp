#include <cerrno>
#include <utility>

#include "platform/fileoutput/Answer.h"
#include "webapi/base/BrokenPipe.h"
#include "webapi/platform/FileOutput.h"

namespace {

/// The name of a file by its path; "" for a descriptor's, which names nothing.
std::string nameOf(const std::string& path) {
  const bool isDescriptor = path.starts_with("/proc/") || path.starts_with("/dev/fd/");
  return isDescriptor ? "" : path.substr(path.rfind('/') + 1);
}

int send(const QELO::Platform::Content& content, const std::vector<std::string>& lines,
         const std::string& type, const std::string& name) {
  const QELO::BrokenPipe tolerated;
  QELO::Platform::Answer answer(content, lines, type, name);
  return answer.Send() ? 0 : HTTPFileOutputer::kBrokenOff;
}

}  // namespace

HTTPFileOutputer::HTTPFileOutputer() = default;

HTTPFileOutputer::~HTTPFileOutputer() = default;

void HTTPFileOutputer::AddHeader(const std::string& line) {
  lines_.push_back(line);
}

int HTTPFileOutputer::Output(const std::string& path, const std::string& type) {
  const std::vector<std::string> lines = std::exchange(lines_, {});
  QELO::Platform::Content content;
  const int error = content.OpenFile(path);
  if (error != 0) {
    errno = error;
    return kNothingSent;
  }
  return send(content, lines, type, nameOf(path));
}

int HTTPFileOutputer::Output(std::FILE* stream, const std::string& name, const std::string& type) {
  const std::vector<std::string> lines = std::exchange(lines_, {});
  QELO::Platform::Content content;
  const int error = content.TakeStream(stream);
  if (error != 0) {
    errno = error;
    return kNothingSent;
  }
  return send(content, lines, type, name);
}
