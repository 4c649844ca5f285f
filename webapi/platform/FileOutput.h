#pragma once

#include <cstdio>
#include <string>
#include <vector>

#include "webapi/Export.h"

/// The host's HTTP file output library: a file or a stream as the answer to the CGI request that
/// the process environment describes, on standard output.
class WEBAPI_API HTTPFileOutputer {
 public:
  /// What Output() gives beside 0, with which the answer has gone out whole.
  static constexpr int kNothingSent =
      -1;                                ///< it cannot be read, errno says why; nothing is printed
  static constexpr int kBrokenOff = -2;  ///< some of it is printed: the client is gone, say

  HTTPFileOutputer();
  HTTPFileOutputer(const HTTPFileOutputer&) = delete;
  HTTPFileOutputer& operator=(const HTTPFileOutputer&) = delete;
  ~HTTPFileOutputer();

  /// A header line of the next output, "Name: value" without line end, which goes out before those
  /// that the output adds. Of a line that both have one goes out: the output's own "Content-Type",
  /// "Content-Length", "Content-Range" and, where it is not 200, "Status"; of all others the one
  /// that was added here.
  /// @param line  a line that may be sent: neither CR nor LF nor NUL. It takes the place of one
  /// with
  ///              the same name, whatever its capitals, that was added before.
  void AddHeader(const std::string& line);

  /// The type that the host's MIME database gives a file name; "application/octet-stream" when it
  /// has none.
  static std::string GetMimeType(const std::string& name);

  /// Sends a regular file: opened once, with the rights that the process has now. Links are
  /// followed. The client may ask for ranges of it and set conditions, and its last part is the
  /// name to save it by.
  /// @return kNothingSent also for what is no regular file (errno is EINVAL)
  int Output(const std::string& path, const std::string& type);
  /// Sends what is left of an open stream, which stays the caller's. Of a regular file that is what
  /// is there now, with ranges and conditions as above; of anything else all until its end.
  /// @param name  to save it by; "": none
  int Output(std::FILE* stream, const std::string& name, const std::string& type);

 private:
  std::vector<std::string> lines_;
};

namespace QELO::HTTP {

/// What the host's file output has for the whole process.
class WEBAPI_API FileOutputerHelper {
 public:
  /// Whether whole files may be handed to the web server, which sends them itself.
  static void SetFastOutputEnabled(bool enabled);
  /// Whether the host is set up for that, and it was not switched off.
  static bool IsFastOutputEnabled();
  /// The value of a "Content-Disposition" header for a file of any name: only its last part is
  /// kept, and what could deceive or break the header is "_".
  /// @param name      UTF-8; "": no name
  /// @param isInline  whether browsers may show it, instead of saving it
  static std::string ContentDisposition(const std::string& name, bool isInline);
};

}  // namespace QELO::HTTP
