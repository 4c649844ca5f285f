#include "programs/webapi-exec/transfer/SentSlice.h"

#include <unistd.h>

#include <cstdlib>

#include "webapi/base/Hex.h"
#include "webapi/platform/Upload.h"

namespace QELO::ExecProgram {
namespace {

constexpr uid_t kNobody = static_cast<uid_t>(-1);
constexpr int kMostLooks = 100;       ///< at a file that another call has
constexpr useconds_t kPause = 20000;  ///< microseconds between two

/// FNV-1a of a text, from one of its bases.
std::string hashText(const std::string& text, uint64_t hash) {
  constexpr uint64_t kPrime = 0x100000001b3;
  for (const char c : text) {
    hash = (hash ^ static_cast<unsigned char>(c)) * kPrime;
  }
  return HexText({reinterpret_cast<const char*>(&hash), sizeof hash});
}

/// A name that stays the same while the file does.
std::string idOf(const std::string& call, const struct stat& file) {
  std::string text = call;
  for (const long long number :
       {static_cast<long long>(file.st_dev), static_cast<long long>(file.st_ino),
        static_cast<long long>(file.st_size), static_cast<long long>(file.st_mtim.tv_sec),
        static_cast<long long>(file.st_mtim.tv_nsec)}) {
    text += " " + std::to_string(number);
  }
  return hashText(text, 0xcbf29ce484222325) + hashText(text, 0x9ae16a3b2f90404f);
}

/// A call that was ended a moment ago may still be at its last bytes.
bool openPart(uid_t caller) {
  int result = QeloCgiUploadCallerSet(caller);
  for (int looks = 0; result == QELO_UPLOAD_BUSY && looks < kMostLooks; ++looks) {
    usleep(kPause);
    result = QeloCgiUploadCallerSet(caller);
  }
  return result == 0;
}

}  // namespace

void SentSlice::Find(uid_t caller, const std::string& call, const struct stat& file) {
  if (file.st_size < kWorthwhile) {
    return;
  }
  said_["HTTP_X_TYPE_NAME"] = "SLICEUPLOAD";
  said_["HTTP_X_UPLOAD_ID"] = idOf(call, file);
  said_["HTTP_X_FILE_SIZE"] = std::to_string(file.st_size);
  said_["HTTP_X_SLICE_OFFSET"] = "0";
  for (const auto& [name, value] : said_) {
    setenv(name.c_str(), value.c_str(), 1);
  }
  unsigned long long received = 0;
  unsigned long long size = 0;
  const bool isPossible = openPart(caller) && QeloCgiUploadSliceGet(&received, &size) == 1;
  QeloCgiUploadCallerSet(kNobody);  // the call's process takes it up
  if (isPossible) {
    there_ = received;
    said_["HTTP_X_SLICE_OFFSET"] = std::to_string(received);
    setenv("HTTP_X_SLICE_OFFSET", said_["HTTP_X_SLICE_OFFSET"].c_str(), 1);
    return;
  }
  for (const auto& [name, value] : said_) {
    unsetenv(name.c_str());
  }
  said_.clear();
}

void SentSlice::Tell(Json::Value& request) const {
  for (const auto& [name, value] : said_) {
    request[name] = value;
  }
}

}  // namespace QELO::ExecProgram
