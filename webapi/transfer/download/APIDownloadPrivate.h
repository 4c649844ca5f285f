#pragma once

#include <cstdio>
#include <string>

#include "webapi/platform/FileOutput.h"

namespace QELO {

class APIDownload;
class APIResponse;

/// The state of a download.
class APIDownloadPrivate {
 public:
  /// @param response  null: one is made, and deleted in the end
  APIDownloadPrivate(APIDownload* owner, APIResponse* response);
  APIDownloadPrivate(const APIDownloadPrivate&) = delete;
  APIDownloadPrivate& operator=(const APIDownloadPrivate&) = delete;
  ~APIDownloadPrivate();

  APIResponse& response() { return *response_; }
  /// @param value  of the header "Content-Disposition"
  void SetDisposition(const std::string& value) { disposition_ = value; }
  void SetMimeType(const std::string& type) { mimeType_ = type; }
  int Output(const std::string& path);
  int Output(std::FILE* stream);

 private:
  /// Whether what is sent would reach somebody; it is logged when it would not.
  /// @return false with errno EPERM
  static bool MaySend();
  /// Gives the response's header lines to the outputer, which prints them before its own.
  void PrintHeader();
  /// What an output that gave `result` leaves to do.
  int Finish(int result);

  APIDownload* owner_;
  APIResponse* response_;
  bool ownsResponse_;
  /// Kept from the response: an error that the method answers after all is no file to save.
  std::string disposition_;
  std::string mimeType_;
  HTTPFileOutputer outputer_;
};

}  // namespace QELO
