#include "webapi/transfer/upload/APIUploadPrivate.h"

#include <sys/stat.h>

#include <algorithm>
#include <new>
#include <utility>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/transfer/upload/TemporaryDirectory.h"

namespace QELO {
namespace {

constexpr char kFilesAttribute[] = "_upload_files";
/// Bytes that must be free beyond what comes: it comes into a file system that others write to.
constexpr unsigned long long kMargin = 5ULL << 20;
/// More than any disk has free.
constexpr uint64_t kMostBytes = 1ULL << 62;
constexpr int kHashSize = 256;

/// A length that a client announces may be any number.
unsigned long long withMargin(uint64_t length) {
  return std::min(length, kMostBytes) + kMargin;
}

/// Of a file that comes in slices, the bytes that are still to come.
uint64_t restOfSlices(const APIRequest& request) {
  if (!request.IsSliceUploadRequest()) {
    return 0;
  }
  const uint64_t size = JsonHelper::asUInt64(request.GetEnv("HTTP_X_FILE_SIZE", 0), 0);
  return size - std::min(size, JsonHelper::asUInt64(request.GetEnv("HTTP_X_SLICE_OFFSET", 0), 0));
}

/// One that loaders fill, and may make anew meanwhile.
struct Hash {
  Hash() = default;
  Hash(const Hash&) = delete;
  Hash& operator=(const Hash&) = delete;
  ~Hash() { QLIBCSzHashFree(hash); }

  QLIBSZHASH* hash = QLIBCSzHashAlloc(kHashSize);
};

uint64_t sizeOf(const std::string& path) {
  struct stat info {};
  return lstat(path.c_str(), &info) == 0 ? static_cast<uint64_t>(info.st_size) : 0;
}

/// Calls for each entry that has a name and a value.
template <typename Call>
void forEach(const QLIBSZHASH* hash, Call call) {
  const char* value = nullptr;
  for (const char* name = QLIBCSzHashNext(hash, nullptr, &value); name != nullptr;
       name = QLIBCSzHashNext(hash, name, &value)) {
    if (*name != '\0' && *value != '\0') {
      call(name, value);
    }
  }
}

}  // namespace

int APIUploadPrivate::GetUploadAll(Json::Value& params, Json::Value* tmpFiles) try {
  const uint64_t length =
      request_ == nullptr ? 0 : JsonHelper::asUInt64(request_->GetEnv("CONTENT_LENGTH", 0), 0);
  if (length == 0) {
    return APIUpload::NOTHING_LEFT;
  }
  std::string directory;
  if (!ChooseTemporaryDirectory(withMargin(std::max(length, restOfSlices(*request_))), directory)) {
    return APIUpload::NO_DIRECTORY;
  }
  Hash parameters;
  Hash files;
  if (parameters.hash == nullptr || files.hash == nullptr) {
    WEBAPI_LOG("APIUpload.cpp", "cannot alloc memory for hash!");
    return APIUpload::NO_MEMORY;
  }
  const int result = QeloCgiLoadUploadAll(&parameters.hash, &files.hash, directory.c_str(), 0);
  if (tmpFiles != nullptr && (tmpFiles->isNull() || tmpFiles->isArray())) {
    forEach(files.hash, [&](const char*, const char* path) { tmpFiles->append(path); });
  }
  if (result != APIUpload::DONE) {
    return result;
  }
  Json::Value fields(params);
  if (!WebAPIUtil::SzHashToJsonObj(parameters.hash, fields) ||
      !WebAPIUtil::SzHashToJsonObj(files.hash, fields)) {
    WEBAPI_LOG("APIUpload.cpp", "cannot convert hash to Json object!");
    return APIUpload::NO_MEMORY;
  }
  Json::Value texts(Json::objectValue);
  forEach(parameters.hash, [&texts](const char* name, const char* text) { texts[name] = text; });
  request_->KeepSentTexts(std::move(texts));
  forEach(files.hash, [&](const char* field, const char* path) {
    const char* name = QLIBCSzHashGetValue(parameters.hash, field);
    AddFile(field, name != nullptr ? name : "", path);
  });
  params.swap(fields);
  return result;
} catch (const std::bad_alloc&) {
  WEBAPI_LOG("APIUpload.cpp", "cannot alloc memory for hash!");
  return APIUpload::NO_MEMORY;
}

bool APIUploadPrivate::TakeParameters(Json::Value& params) {
  if (WebAPIUtil::SzHashToJsonObj(parameters_, params)) {
    return true;
  }
  WEBAPI_LOG("APIUpload.cpp", "cannot convert hash to Json object!");
  state_.result = APIUpload::NO_MEMORY;
  return false;
}

int APIUploadPrivate::GetUploadParam(Json::Value& params) {
  if (request_ == nullptr) {
    return state_.result = APIUpload::NOTHING_LEFT;
  }
  if (parameters_ == nullptr && (parameters_ = QLIBCSzHashAlloc(kHashSize)) == nullptr) {
    WEBAPI_LOG("APIUpload.cpp", "cannot alloc memory for hash!");
    return state_.result = APIUpload::NO_MEMORY;
  }
  const int loaded = QeloCgiLoadUploadParams(&parameters_, progress_, &state_, part_, sizeof part_,
                                             field_, sizeof field_, file_, sizeof file_);
  if (loaded > 0 && TakeParameters(params) && field_[0] != '\0' && file_[0] != '\0') {
    params[field_] = file_;
  }
  return state_.result;
}

int APIUploadPrivate::GetUploadFile(Json::Value& params) {
  if (!HasFile()) {
    return state_.result = APIUpload::NO_FILE;
  }
  if (state_.left == 0) {
    return state_.result = APIUpload::NOTHING_LEFT;
  }
  std::string directory;
  const uint64_t coming = std::max<uint64_t>(state_.left, restOfSlices(*request_));
  if (!ChooseTemporaryDirectory(withMargin(coming), directory)) {
    return state_.result = APIUpload::NO_DIRECTORY;
  }
  const std::string field = field_;
  const std::string name = file_;
  const int loaded = QeloCgiLoadUploadFileToDir(&parameters_, directory.c_str(), progress_, &state_,
                                                part_, field_, file_);
  if (loaded == APIUpload::DONE) {
    const char* path = QLIBCSzHashGetValue(parameters_, field.c_str());
    AddFile(field, name, path != nullptr ? path : "");
  }
  if (loaded > 0) {
    TakeParameters(params);
  }
  return state_.result;
}

void APIUploadPrivate::AddFile(const std::string& field, const std::string& name,
                               const std::string& path) {
  Json::Value& attributes = request_->Serialize()["attr"];
  if (!attributes.isObject()) {
    return;  // somebody changed the record in place
  }
  Json::Value& files = attributes[kFilesAttribute];
  if (!files.isArray()) {
    files = Json::Value(Json::arrayValue);
  }
  Json::Value file(Json::objectValue);
  file["field"] = field;
  file["name"] = name;
  file["path"] = path;
  file["size"] = Json::UInt64{sizeOf(path)};
  files.append(std::move(file));
}

Json::Value APIUploadPrivate::Slice() {
  Json::Value slice;
  unsigned long long received = 0;
  unsigned long long size = 0;
  if (QeloCgiUploadSliceGet(&received, &size) == 1) {
    slice["received"] = Json::UInt64{received};
    slice["size"] = Json::UInt64{size};
  }
  return slice;
}

Json::Value APIUploadPrivate::Files() const {
  Json::Value files =
      request_ != nullptr ? request_->GetAttr(kFilesAttribute, Json::Value()) : Json::Value();
  return files.isArray() ? files : Json::Value(Json::arrayValue);
}

}  // namespace QELO
