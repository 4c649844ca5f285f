// Sends files and streams as downloads.
//
// Tests: downloads.py

#include <fcntl.h>
#include <unistd.h>
#include <webapi/APIDownload.h>

#include <cerrno>
#include <cstdio>
#include <string>

#include "PluginTable.h"

static std::string text(QELO::APIRequest* request, const char* name) {
  return request->GetParam(name, "").asString();
}

static void finish(int result, QELO::APIResponse* response) {
  if (result == QELO::APIDownload::kNothingSent) {
    response->SetError(400, errno);
  } else {
    response->SetSuccess(result);
  }
}

/// Sends the file "path", by the name "name" and with the type "type" where they are given.
static void file(QELO::APIRequest* request, QELO::APIResponse* response) {
  QELO::APIDownload download(response);
  download.SetMimeType(text(request, "type"));
  if (request->HasParam("name")) {
    download.SetFileName(text(request, "name"), request->HasParam("inline"));
  }
  finish(download.Output(text(request, "path")), response);
}

/// Sends the file "path" from the byte "from" on by a descriptor.
static void descriptor(QELO::APIRequest* request, QELO::APIResponse* response) {
  const std::string path = text(request, "path");
  std::FILE* stream = fdopen(open(path.c_str(), O_RDONLY | O_CLOEXEC), "r");
  if (stream == nullptr) {
    response->SetError(400, errno);
    return;
  }
  fseeko(stream, request->GetParam("from", 0).asInt(), SEEK_SET);
  QELO::APIDownload download(response);
  download.SetMimeTypeFromFileName(path);
  finish(download.Output(stream), response);
  std::fclose(stream);
}

/// Sends what another program prints, which is "size" bytes.
static void stream(QELO::APIRequest* request, QELO::APIResponse* response) {
  std::FILE* pipe =
      popen(("yes | head -c " + std::to_string(request->GetParam("size", 0).asInt())).c_str(), "r");
  finish(QELO::APIDownload(response).Output(pipe), response);
  pclose(pipe);
}

/// Sends bytes for as long as somebody takes them.
static void endless(QELO::APIRequest*, QELO::APIResponse* response) {
  std::FILE* zeros = std::fopen("/dev/zero", "re");
  finish(QELO::APIDownload(response).Output(zeros), response);
  std::fclose(zeros);
}

#define SENDING(method) \
  { "QELO.Test.Sending", 1, #method, method }

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {SENDING(file),
                                         SENDING(descriptor),
                                         SENDING(stream),
                                         SENDING(endless),
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
