#include <cerrno>

#include "tests/support/FakePlatform.h"
#include "webapi/platform/FileOutput.h"

namespace {

FakePlatform& fake() {
  return FakePlatform::Get();
}

int output(const std::string& call, std::vector<std::string>& lines) {
  for (const std::string& line : lines) {
    fake().calls.push_back("HTTPFileOutputer::AddHeader(" + line + ")");
  }
  lines.clear();
  fake().calls.push_back("HTTPFileOutputer::Output(" + call + ")");
  errno = ENOENT;
  return fake().fileOutput;
}

}  // namespace

HTTPFileOutputer::HTTPFileOutputer() = default;
HTTPFileOutputer::~HTTPFileOutputer() = default;

void HTTPFileOutputer::AddHeader(const std::string& line) {
  lines_.push_back(line);
}

std::string HTTPFileOutputer::GetMimeType(const std::string& name) {
  return "type/of-" + name;
}

int HTTPFileOutputer::Output(const std::string& path, const std::string& type) {
  return output(path + ", " + type, lines_);
}

int HTTPFileOutputer::Output(std::FILE* stream, const std::string& name, const std::string& type) {
  return output((stream == nullptr ? "null" : "stream") + (", " + name) + ", " + type, lines_);
}

namespace QELO::HTTP {

void FileOutputerHelper::SetFastOutputEnabled(bool enabled) {
  fake().fastOutput = enabled;
}

bool FileOutputerHelper::IsFastOutputEnabled() {
  return fake().fastOutput;
}

std::string FileOutputerHelper::ContentDisposition(const std::string& name, bool isInline) {
  return (isInline ? "inline:" : "attachment:") + name;
}

}  // namespace QELO::HTTP
