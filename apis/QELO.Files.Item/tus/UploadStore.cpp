#include <dirent.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>
#include <webapi/JsonHelper.h>

#include <algorithm>
#include <memory>

#include "tus/Upload.h"

namespace files {
namespace {

namespace JsonHelper = QELO::JsonHelper;

constexpr char kSuffix[] = ".json";
constexpr size_t kIdLength = 32;  ///< hexadecimal digits

struct Close {
  void operator()(DIR* stream) const { closedir(stream); }
};

Json::Value jsonOf(const UploadState& state) {
  Json::Value json(Json::objectValue);
  json["path"] = state.path.Text();
  json["existing"] = static_cast<int>(state.existing);
  json["length"] = Json::UInt64{state.length};
  json["metadata"] = state.metadata;
  json["data"] = state.dataName;
  json["inode"] = Json::UInt64{state.inode};
  json["checked"] = Json::Int64{state.checkedLength};
  json["finished"] = state.isFinished;
  return json;
}

bool stateOf(const Json::Value& json, UploadState& state) {
  const int existing = JsonHelper::asInt(JsonHelper::member(json, "existing"));
  state.existing = existing == static_cast<int>(Existing::kReplace) ? Existing::kReplace
                   : existing == static_cast<int>(Existing::kSkip)  ? Existing::kSkip
                                                                    : Existing::kRefuse;
  state.length = JsonHelper::asUInt64(JsonHelper::member(json, "length"));
  state.metadata = JsonHelper::asString(JsonHelper::member(json, "metadata"));
  state.dataName = JsonHelper::asString(JsonHelper::member(json, "data"));
  state.inode = JsonHelper::asUInt64(JsonHelper::member(json, "inode"));
  state.checkedLength = JsonHelper::asInt64(JsonHelper::member(json, "checked"), -1);
  state.isFinished = JsonHelper::asBool(JsonHelper::member(json, "finished"));
  return isTemporaryName(state.dataName) && state.dataName.find('/') == std::string::npos &&
         VirtualPath::Parse(JsonHelper::asString(JsonHelper::member(json, "path")), state.path) ==
             Reason::kNone &&
         isNewName(state.path.Name());
}

time_t changeOf(const std::string& file) {
  struct stat info {};
  return stat(file.c_str(), &info) == 0 ? info.st_mtime : 0;
}

}  // namespace

bool UploadStore::IsId(const std::string& id) {
  return id.size() == kIdLength && id.find_first_not_of("0123456789abcdef") == std::string::npos;
}

bool UploadStore::Sweep(const Shares& shares) const {
  const std::unique_ptr<DIR, Close> stream(opendir(directory_.c_str()));
  unsigned unfinished = 0;
  unsigned states = 0;
  const time_t now = time(nullptr);
  while (const dirent* entry = stream != nullptr ? readdir(stream.get()) : nullptr) {
    const std::string name = entry->d_name;
    const std::string id = name.substr(0, name.rfind('.'));
    UploadState state;
    if (!name.ends_with(kSuffix) || !IsId(id)) {
      continue;
    }
    if (++states > kMostStates) {
      return false;
    }
    if (!Load(id, state)) {
      Remove(id);
      continue;
    }
    if (state.isFinished) {
      if (changeOf(FileOf(id)) + kFinishedLifetime < now) {
        Remove(id);
      }
      continue;
    }
    UploadData data;
    const Reason reason = UploadData::Open(shares, state, data);
    const time_t last = reason == Reason::kNone ? data.LastChange() : changeOf(FileOf(id));
    // Where the folder cannot be reached now it may be later, until the time is over.
    if (reason == Reason::kNotFound || (reason != Reason::kBusy && last + kLifetime < now)) {
      data.Remove(state);
      Remove(id);
    } else {
      ++unfinished;
    }
  }
  return unfinished < kMostUnfinished;
}

bool UploadStore::Create(const UploadState& state, std::string& id) const {
  unsigned char bytes[kIdLength / 2] = {};
  if (getrandom(bytes, sizeof bytes, 0) != static_cast<ssize_t>(sizeof bytes)) {
    return false;
  }
  std::string made;
  for (const unsigned char byte : bytes) {
    constexpr char kDigits[] = "0123456789abcdef";
    made += kDigits[byte >> 4];
    made += kDigits[byte & 15];
  }
  mkdir(directory_.c_str(), 0700);
  if (!Save(made, state)) {
    return false;
  }
  id = made;
  return true;
}

bool UploadStore::Load(const std::string& id, UploadState& state) const {
  Json::Value json;
  return IsId(id) && JsonHelper::fromFile(FileOf(id), json) && stateOf(json, state);
}

bool UploadStore::Save(const std::string& id, const UploadState& state) const {
  return JsonHelper::toFile(FileOf(id), jsonOf(state));
}

void UploadStore::Remove(const std::string& id) const {
  unlink(FileOf(id).c_str());
}

}  // namespace files
