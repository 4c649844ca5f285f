#pragma once

#include <json/json.h>

#include <cstdio>
#include <memory>
#include <string>

#include "webapi/Export.h"

namespace QELO {

class APIDownloadPrivate;
class APIResponse;

/// Sends a file or a stream as the answer to a request, in place of a JSON body.
///
/// The method's description needs "allowDownload"; without it nothing is sent (EPERM, logged). A
/// method answers errors as any other until one of the Output() operations has printed something;
/// that turns the framework's own output off.
class WEBAPI_API APIDownload {
 public:
  /// What Output() gives beside 0, with which the answer has gone out whole, "not changed" and
  /// "no such range" among them.
  static constexpr int kNothingSent =
      -1;                                ///< it cannot be read, errno says why; nothing is printed,
                                         ///< so that the method can still answer an error
  static constexpr int kBrokenOff = -2;  ///< some of it is printed: the client has hung up, say

  /// With a response of its own.
  APIDownload();
  /// @param response  whose headers are sent; not owned, must outlive this; null: one of its own
  explicit APIDownload(APIResponse* response);
  APIDownload(const APIDownload&) = delete;
  APIDownload& operator=(const APIDownload&) = delete;
  virtual ~APIDownload();

  /// Sets a header of the response. A header that the output makes itself, as
  /// "Content-Security-Policy", "Cache-Control", "ETag" or "Content-Disposition", is taken from
  /// here; but for "Content-Type", which SetMimeType() sets.
  /// @return false when `name` is empty
  bool SetHeader(const std::string& name, const std::string& value);
  /// Sets each member that is a text, in order; others are left out.
  /// @return false at the first that cannot be set; those before it stay
  bool SetHeader(const Json::Value& headers);
  /// The name that browsers save it by: the header "Content-Disposition", for a name in any script.
  /// Only the last part of a path is kept, and what could deceive is "_". Without it, a file has
  /// its own name. Sent with files alone, not with an error that the method answers after all.
  /// @param isInline  whether browsers may show it instead; scripts in it do not run
  void SetFileName(const std::string& name, bool isInline = false);

  /// The content's type. Default: a file's by its name, "application/octet-stream" for a stream.
  void SetMimeType(const std::string& type);
  /// The type that the host has for files of such a name.
  void SetMimeTypeFromFileName(const std::string& name);

  /// Sends a regular file, opened once with the rights that the method has now; links are followed.
  /// Anything but a regular file is refused (EINVAL). The client may ask for ranges of it, and for
  /// it only when it has changed.
  int Output(const std::string& path);
  /// Sends what is left of an open stream, which stays the caller's: a regular file as above from
  /// the stream's position on, anything else until its end. A file that was opened by a descriptor
  /// is sent so, with fdopen().
  int Output(std::FILE* stream);

  /// Has this process send all files itself.
  void SetXSendFileDisabled();
  /// Whether whole files may be handed to the web server: the host is set up for it, and it was not
  /// switched off.
  bool GetXSendFileEnabled() const;

 private:
  std::unique_ptr<APIDownloadPrivate> private_;
};

}  // namespace QELO
