#include "tus/Exchange.h"

#include <sys/statvfs.h>
#include <webapi/JsonHelper.h>
#include <webapi/WebAPIError.h>

#include <charconv>
#include <ctime>

#include "calls/ReadExisting.h"
#include "text/Metadata.h"

namespace files {
namespace {

using QELO::APIRequest;

constexpr char kVersion[] = "1.0.0";
constexpr char kNoPreferences[] = "/tmp";  ///< what users without a home are given
constexpr char kBodyType[] = "application/offset+octet-stream";

constexpr char kOk[] = "200";
constexpr char kCreated[] = "201";
constexpr char kNoContent[] = "204";
constexpr char kBadRequest[] = "400";
constexpr char kNotFound[] = "404";
constexpr char kNotAllowed[] = "405";
constexpr char kConflict[] = "409";
constexpr char kOtherVersion[] = "412";
constexpr char kTooLarge[] = "413";
constexpr char kOtherType[] = "415";
constexpr char kTooMany[] = "429";

const char* statusOf(Reason reason) {
  switch (reason) {
    case Reason::kBadPath:
    case Reason::kBadName:
    case Reason::kTooDeep:
      return kBadRequest;
    case Reason::kNoShare:
    case Reason::kShareBroken:
    case Reason::kNotFound:
      return kNotFound;
    case Reason::kDenied:
    case Reason::kReadOnly:
    case Reason::kShareItself:
      return "403";
    case Reason::kTooLarge:
      return kTooLarge;
    case Reason::kBusy:
      return "423";
    case Reason::kTooMany:
      return kTooMany;
    case Reason::kFull:
      return "507";
    case Reason::kFailed:
      return "500";
    default:
      return kConflict;
  }
}

/// @return false when the text is no number of bytes
bool readNumber(const std::string& text, uint64_t& number) {
  const char* end = text.data() + text.size();
  const auto result = std::from_chars(text.data(), end, number);
  return result.ec == std::errc() && result.ptr == end && !text.empty();
}

std::string dateOf(time_t when) {
  char text[64] = "";
  tm parts{};
  gmtime_r(&when, &parts);
  strftime(text, sizeof text, "%a, %d %b %Y %H:%M:%S GMT", &parts);
  return text;
}

bool hasRoom(const Folder& folder, uint64_t length) {
  struct statvfs room {};
  return fstatvfs(folder.Get(), &room) != 0 || room.f_bavail * room.f_frsize >= length;
}

}  // namespace

Exchange::Exchange(APIRequest* request, QELO::APIResponse* response)
    : call_(request, response),
      store_(request->GetPreferenceDir()),
      hasStore_(request->GetPreferenceDir() != kNoPreferences),
      id_(request->GetAndCheckString("upload", APIRequest::PARAM_OPTIONAL).Get("")) {}

std::string Exchange::Header(const char* name) const {
  return QELO::JsonHelper::asString(call_.Request().GetEnv(name, ""));
}

void Exchange::Serve() {
  std::string method = Header("REQUEST_METHOD");
  const std::string instead = Header("HTTP_X_HTTP_METHOD_OVERRIDE");
  if (method == "POST" && !instead.empty()) {
    method = instead;
  }
  call_.Response().SetHeader("Tus-Resumable", kVersion);
  if (method == "OPTIONS") {
    Options();
  } else if (Header("HTTP_TUS_RESUMABLE") != kVersion) {
    call_.Response().SetHeader("Tus-Version", kVersion);
    Answer(kOtherVersion);
  } else if (!hasStore_) {
    Refuse("403", Reason::kNoHome, "/");
  } else if (method == "POST") {
    Create();
  } else if (method == "HEAD") {
    Head();
  } else if (method == "PATCH") {
    Patch();
  } else if (method == "DELETE") {
    Delete();
  } else {
    Answer(kNotAllowed);
  }
}

void Exchange::Options() {
  call_.Response().SetHeader("Tus-Version", kVersion);
  call_.Response().SetHeader("Tus-Extension", "creation,expiration,checksum,termination");
  call_.Response().SetHeader("Tus-Checksum-Algorithm", "sha1,sha256");
  call_.Response().SetHeader("Tus-Max-Size", std::to_string(kLargest));
  Answer(kNoContent);
}

void Exchange::Create() {
  UploadState state;
  VirtualPath folderPath;
  Folder folder;
  Item taken;
  state.metadata = Header("HTTP_UPLOAD_METADATA");
  const auto named = call_.Request().GetAndCheckString("name", APIRequest::PARAM_OPTIONAL);
  const std::string name = named.Get(metadataOf(state.metadata, "filename"));
  if (!readNumber(Header("HTTP_UPLOAD_LENGTH"), state.length) ||
      !readExisting(call_.Request(), state.existing) || state.metadata.size() > kLongestMetadata) {
    Answer(kBadRequest);
    return;
  }
  if (!call_.ReadPath("path", folderPath) || !call_.OpenFolderForChange(folderPath, folder)) {
    const int code = call_.Response().GetError();
    call_.Response().SetHeader("Status", code == QELO::WEBAPI_ERR_BAD_REQUEST
                                             ? kBadRequest
                                             : statusOf(static_cast<Reason>(code)));
    return;
  }
  state.path = folderPath.Child(name);
  const bool isTaken = folder.Look(name, taken) == Reason::kNone;
  const Reason reason = !isNewName(name)          ? Reason::kBadName
                        : state.length > kLargest ? Reason::kTooLarge
                        : isTaken && (state.existing == Existing::kRefuse || taken.IsFolder())
                            ? Reason::kExists
                        : !hasRoom(folder, state.length)       ? Reason::kFull
                        : !store_.Sweep(call_.SharedFolders()) ? Reason::kTooMany
                                                               : Reason::kNone;
  if (reason != Reason::kNone) {
    Refuse(reason, state.path.Text());
    return;
  }
  UploadData data;
  if (const Reason made = UploadData::Make(folder, state, data); made != Reason::kNone) {
    Refuse(made, state.path.Text());
    return;
  }
  if (!store_.Create(state, id_)) {
    data.Remove(state);
    Refuse(Reason::kFailed, state.path.Text());
    return;
  }
  if (state.length == 0 && !Finish(state, data)) {
    return;
  }
  call_.Response().SetHeader("Location", Location());
  call_.Response().SetHeader("Upload-Expires", dateOf(time(nullptr) + UploadStore::kLifetime));
  Answer(kCreated);
}

void Exchange::Head() {
  UploadState state;
  UploadData data;
  if (!Find(state, data)) {
    return;
  }
  if (!state.isFinished) {
    if (!Settle(state, data) || (data.Length() == state.length && !Finish(state, data))) {
      return;
    }
    TellState(state, data.Length(), data.LastChange());
  } else {
    TellState(state, state.length, time(nullptr));
  }
  call_.Response().SetHeader("Upload-Length", std::to_string(state.length));
  if (!state.metadata.empty()) {
    call_.Response().SetHeader("Upload-Metadata", state.metadata);
  }
  Answer(kOk);
}

void Exchange::Patch() {
  UploadState state;
  UploadData data;
  uint64_t offset = 0;
  if (Header("CONTENT_TYPE") != kBodyType) {
    Answer(kOtherType);
    return;
  }
  if (!Find(state, data) || (!state.isFinished && !Settle(state, data))) {
    return;
  }
  uint64_t length = state.isFinished ? state.length : data.Length();
  if (!readNumber(Header("HTTP_UPLOAD_OFFSET"), offset)) {
    Answer(kBadRequest);
    return;
  }
  if (offset != length) {
    Answer(kConflict);
    return;
  }
  if (!state.isFinished) {
    const bool isChecked = !Header("HTTP_UPLOAD_CHECKSUM").empty();
    if (!(isChecked ? ReceiveChecked(state, data, length) : Receive(state, data, length)) ||
        (length == state.length && !Finish(state, data))) {
      return;
    }
  }
  TellState(state, length, time(nullptr));
  Answer(kNoContent);
}

void Exchange::Delete() {
  UploadState state;
  UploadData data;
  if (!Find(state, data)) {
    return;
  }
  data.Remove(state);
  store_.Remove(id_);
  Answer(kNoContent);
}

bool Exchange::Find(UploadState& state, UploadData& data) {
  if (!store_.Load(id_, state)) {
    return Refuse(Reason::kNotFound, "/");
  }
  if (state.isFinished) {
    return true;
  }
  const Share* share = call_.SharedFolders().Find(state.path.Share());
  if (share != nullptr && share->isReadOnly) {  // by now
    return Refuse(Reason::kReadOnly, state.path.Text());
  }
  const Reason reason = UploadData::Open(call_.SharedFolders(), state, data);
  return reason == Reason::kNone || Refuse(reason, state.path.Text());
}

bool Exchange::Settle(UploadState& state, const UploadData& data) {
  if (state.checkedLength < 0) {
    return true;
  }
  const Reason reason = data.Cut(static_cast<uint64_t>(state.checkedLength));
  state.checkedLength = -1;
  if (reason != Reason::kNone || !store_.Save(id_, state)) {
    return Refuse(Reason::kFailed, state.path.Text());
  }
  return true;
}

bool Exchange::Finish(UploadState& state, const UploadData& data) {
  if (const Reason reason = data.Finish(state); reason != Reason::kNone) {
    return Refuse(reason, state.path.Text());
  }
  state.isFinished = true;
  store_.Save(id_, state);
  return true;
}

/// The same address, by which the caller has shown who it is, with the upload in place of the
/// folder.
std::string Exchange::Location() const {
  APIRequest& request = call_.Request();
  const std::string address = QELO::JsonHelper::asString(request.GetEnv("REQUEST_URI", ""));
  std::string location = address.substr(0, address.find('?')) + "?api=" + request.GetAPIClass() +
                         "&version=" + std::to_string(request.GetAPIVersion()) +
                         "&method=" + request.GetAPIMethod();
  for (const char* credential : {"_sid", "tid"}) {
    const std::string value =
        request.GetAndCheckString(credential, APIRequest::PARAM_OPTIONAL).Get("");
    if (!value.empty() && isPlain(value)) {
      location += std::string("&") + credential + "=" + value;
    }
  }
  return location + "&upload=%22" + id_ + "%22";
}

void Exchange::TellState(const UploadState& state, uint64_t offset, time_t lastChange) {
  call_.Response().SetHeader("Upload-Offset", std::to_string(offset));
  if (!state.isFinished) {
    call_.Response().SetHeader("Upload-Expires", dateOf(lastChange + UploadStore::kLifetime));
  }
}

void Exchange::Answer(const char* status) {
  call_.Response().SetHeader("Status", status);
  call_.Response().SetSuccess();
}

bool Exchange::Refuse(const char* status, Reason reason, const std::string& path) {
  call_.Response().SetHeader("Status", status);
  return call_.Refuse(reason, path);
}

bool Exchange::Refuse(Reason reason, const std::string& path) {
  return Refuse(statusOf(reason), reason, path);
}

}  // namespace files
