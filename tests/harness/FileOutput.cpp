// Files as answers: header lines and the whole file, in place of what web servers and ranges ask
// for.

#include "webapi/platform/FileOutput.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace {

bool isFastOutput = false;

void print(const std::string& text) {
  [[maybe_unused]] const ssize_t count = write(STDOUT_FILENO, text.data(), text.size());
}

int send(std::FILE* file, const std::string& type, std::vector<std::string>& lines) {
  std::string body;
  char buffer[65536];
  for (size_t count = 0; (count = std::fread(buffer, 1, sizeof buffer, file)) > 0;) {
    body.append(buffer, count);
  }
  for (const std::string& line : lines) {
    if (line.rfind("Content-type:", 0) != 0) {
      print(line + "\r\n");
    }
  }
  lines.clear();
  print("Content-Type: " + type + "\r\nContent-Length: " + std::to_string(body.size()) +
        "\r\n\r\n" + body);
  return 0;
}

}  // namespace

HTTPFileOutputer::HTTPFileOutputer() = default;
HTTPFileOutputer::~HTTPFileOutputer() = default;

void HTTPFileOutputer::AddHeader(const std::string& line) {
  lines_.push_back(line);
}

std::string HTTPFileOutputer::GetMimeType(const std::string& name) {
  const size_t dot = name.rfind('.');
  return dot == std::string::npos ? "application/octet-stream" : "type/of-" + name.substr(dot + 1);
}

int HTTPFileOutputer::Output(const std::string& path, const std::string& type) {
  struct stat info {};
  std::FILE* file = stat(path.c_str(), &info) == 0 ? std::fopen(path.c_str(), "re") : nullptr;
  if (file == nullptr) {
    return kNothingSent;
  }
  if (!S_ISREG(info.st_mode)) {
    std::fclose(file);
    errno = EINVAL;
    return kNothingSent;
  }
  const int result = send(file, type, lines_);
  std::fclose(file);
  return result;
}

int HTTPFileOutputer::Output(std::FILE* stream, const std::string&, const std::string& type) {
  if (stream == nullptr) {
    errno = EBADF;
    return kNothingSent;
  }
  return send(stream, type, lines_);
}

namespace QELO::HTTP {

void FileOutputerHelper::SetFastOutputEnabled(bool enabled) {
  isFastOutput = enabled;
}

bool FileOutputerHelper::IsFastOutputEnabled() {
  return isFastOutput;
}

std::string FileOutputerHelper::ContentDisposition(const std::string& name, bool isInline) {
  return (isInline ? "inline; filename=\"" : "attachment; filename=\"") + name + "\"";
}

}  // namespace QELO::HTTP
