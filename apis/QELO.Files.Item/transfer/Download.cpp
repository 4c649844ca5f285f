// Files out: one as it is, several and folders as an archive.

#include <webapi/APIDownload.h>

#include <cstdio>
#include <memory>

#include "calls/Call.h"
#include "calls/Methods.h"
#include "transfer/ArchiveStream.h"

namespace files {
namespace {

using QELO::APIDownload;
using QELO::APIRequest;
using QELO::APIResponse;

constexpr char kArchiveType[] = "application/zip";

struct Close {
  void operator()(std::FILE* stream) const { std::fclose(stream); }
};
using Stream = std::unique_ptr<std::FILE, Close>;

void sendFile(Call& call, const Located& located, bool isInline) {
  Descriptor file;
  Item item;
  Reason reason = located.parent.OpenFile(located.name, file, item);
  const Stream stream(reason == Reason::kNone ? fdopen(file.Get(), "r") : nullptr);
  if (stream == nullptr) {
    call.Refuse(reason != Reason::kNone ? reason : Reason::kFailed, located.path);
    return;
  }
  file.Release();
  APIDownload download(&call.Response());
  call.Response().SetSuccess();
  download.SetFileName(located.name, isInline);
  download.SetMimeTypeFromFileName(located.name);
  if (download.Output(stream.get()) == APIDownload::kNothingSent) {
    call.Refuse(Reason::kFailed, located.path);
  }
}

/// Named after the one item, or after the folder that holds the first of several.
std::string archiveName(const std::vector<VirtualPath>& paths) {
  const VirtualPath& first = paths.front();
  const std::string name = paths.size() == 1 ? first.Name() : first.Parent().Name();
  return (name.empty() ? "files" : name) + ".zip";
}

void sendArchive(Call& call, const std::vector<VirtualPath>& paths) {
  ArchiveStream archive(call.SharedFolders(), paths);
  const Stream stream(archive.Open(call.LibraryDirectory()));
  if (stream == nullptr) {
    call.Refuse(Reason::kFailed, paths.front());
    return;
  }
  APIDownload download(&call.Response());
  call.Response().SetSuccess();
  download.SetFileName(archiveName(paths));
  download.SetMimeType(kArchiveType);
  if (download.Output(stream.get()) == APIDownload::kNothingSent) {
    call.Refuse(Reason::kFailed, paths.front());
  }
}

}  // namespace

void download(APIRequest* request, APIResponse* response) {
  Call call(request, response);
  const auto isInline = request->GetAndCheckBool("inline", APIRequest::PARAM_OPTIONAL);
  std::vector<VirtualPath> paths;
  if (isInline.IsInvalid()) {
    call.RefuseParameters();
    return;
  }
  if (!call.ReadPaths("path", paths)) {
    return;
  }
  Item item;
  for (const VirtualPath& path : paths) {
    Located located;
    if (!call.Locate(path, located)) {
      return;
    }
    if (const Reason reason = located.Look(item); reason != Reason::kNone) {
      call.Refuse(reason, path);
      return;
    }
    if (paths.size() == 1 && !item.IsFolder()) {
      sendFile(call, located, isInline.Get(false));
      return;
    }
  }
  sendArchive(call, paths);
}

}  // namespace files
