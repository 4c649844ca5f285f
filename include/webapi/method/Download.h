#pragma once

#include <json/json.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>

#include "webapi/APIDownload.h"
#include "webapi/WebAPIError.h"

namespace QELO {

/// A file as a method's answer: `return QELO::Download{.path = file, .name = "book.csv"};`. The
/// method's description has "allowDownload". Clients may ask for ranges of it, as APIDownload
/// tells.
struct Download {
  std::string path = {};     ///< of a regular file, opened with the rights of the method
  std::string content = {};  ///< what is sent when there is no path
  /// What is sent when there is a stream, from its position on; closed afterwards. One of
  /// std::tmpfile() holds what would be too large for memory.
  std::shared_ptr<std::FILE> stream = {};
  std::string name = {};  ///< that browsers save it by; "": the file's own
  std::string type = {};  ///< of its content; "": by the file's name
  bool isInline = false;  ///< whether browsers may show it instead
  /// The code of the error when nothing could be sent; its detail is {"reason": ...}.
  int unreadable = WEBAPI_ERR_NO_ANSWER;
};

namespace method {

inline Json::Value ReasonOf(int error) {
  Json::Value detail(Json::objectValue);
  char text[256] = "";
  detail["reason"] = strerror_r(error, text, sizeof text);
  return detail;
}

/// A text as an open file, for Download::stream; null, with errno, when there is none to be had.
inline std::shared_ptr<std::FILE> StreamOf(const std::string& text) {
  const int memory = memfd_create("download", MFD_CLOEXEC);
  std::FILE* file = memory >= 0 ? fdopen(memory, "w+") : nullptr;
  if (file == nullptr) {
    if (memory >= 0) {
      close(memory);
    }
    return nullptr;
  }
  std::shared_ptr<std::FILE> stream(file, std::fclose);
  if (std::fwrite(text.data(), 1, text.size(), file) != text.size() || std::fflush(file) != 0) {
    return nullptr;
  }
  std::rewind(file);
  return stream;
}

/// @return 0, also when the client has hung up, or the errno with which nothing was sent
inline int Send(APIResponse& response, const Download& file) {
  APIDownload download(&response);
  if (!file.name.empty()) {
    download.SetFileName(file.name, file.isInline);
  }
  if (!file.type.empty()) {
    download.SetMimeType(file.type);
  } else if (file.path.empty() && !file.name.empty()) {
    download.SetMimeTypeFromFileName(file.name);
  }
  if (!file.path.empty()) {
    return download.Output(file.path) == APIDownload::kNothingSent ? errno : 0;
  }
  const auto stream = file.stream != nullptr ? file.stream : StreamOf(file.content);
  if (stream == nullptr) {
    return errno;
  }
  return download.Output(stream.get()) == APIDownload::kNothingSent ? errno : 0;
}

}  // namespace method
}  // namespace QELO
