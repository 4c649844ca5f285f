// The loaders of the seam, over the one upload of the process.

#include <strings.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "platform/multipart/PartialFile.h"
#include "platform/multipart/Upload.h"
#include "platform/settings/Settings.h"
#include "webapi/base/FileIdentity.h"
#include "webapi/base/NullDevice.h"
#include "webapi/base/Number.h"

using namespace QELO::Platform;

namespace {

/// What a process has of uploads. At its end the files go, also when a method calls exit().
struct State {
  std::unique_ptr<Upload> upload;
  std::optional<Body> body;  ///< one that is no form
  std::optional<FileOwner> owner;
  std::optional<uid_t> caller;
  std::optional<Slice> slice;  ///< that was loaded
  uint64_t received = 0;       ///< of its file
  QELO::FileIdentity input;    ///< where standard input leads to while it is this upload's
};

State& state() {
  static State instance;
  return instance;
}

std::string variable(const char* name) {
  const char* value = getenv(name);
  return value != nullptr ? value : "";
}

/// What is known of an input before is not that of another one.
State& stateOfInput() {
  State& own = state();
  if (!own.input.IsAt(STDIN_FILENO)) {
    own.upload.reset();
    own.body.reset();
    own.input = QELO::FileIdentity(STDIN_FILENO);
    own.slice.reset();
    own.received = 0;
  }
  return own;
}

Body bodyOfRequest(uint64_t unannounced) {
  uint64_t length = unannounced;
  QELO::ParseNumber(variable("CONTENT_LENGTH"), length);
  return Body(STDIN_FILENO, length, Settings().BodyPace());
}

/// The upload on standard input.
Upload& upload() {
  State& own = stateOfInput();
  if (own.upload == nullptr) {
    own.upload = std::make_unique<Upload>(bodyOfRequest(0), variable("CONTENT_TYPE"));
  }
  return *own.upload;
}

/// Nothing later in the process waits for more of a body that has arrived.
void closeReceived(const Upload& current) {
  if (current.IsReceived()) {
    QELO::PutNullOver({STDIN_FILENO}, O_RDONLY);
    state().input = QELO::FileIdentity(STDIN_FILENO);
  }
}

auto intoHash(QLIBSZHASH** hash) {
  return [hash](const std::string& name, const std::string& value) {
    return QLIBCSzHashSetValue(hash, name.c_str(), value.c_str()) == 0;
  };
}

/// A name for a field's next file that no other has: "f", "f[1]", "f[2]".
std::string freeName(const std::string& field, std::set<std::string>& taken) {
  std::string name = field;
  for (int number = 1; !taken.insert(name).second; ++number) {
    name = field + "[" + std::to_string(number) + "]";
  }
  return name;
}

bool copyText(const std::string& text, char* buffer, int size) {
  return snprintf(buffer, static_cast<size_t>(size), "%s", text.c_str()) < size;
}

void tell(const Upload& current, QeloCgiUploadState& told) {
  told.total = current.Length();
  told.left = current.Length() - current.Position();
  told.result = current.Result();
}

struct LoadedFile {
  std::string key;
  std::string name;
};

int loadAll(Upload& current, const char* directory, QLIBSZHASH** parameters,
            std::vector<LoadedFile>& loaded) {
  std::set<std::string> taken;
  std::string path;
  while (current.ReadFields(intoHash(parameters)) == QELO_UPLOAD_DONE &&
         current.PendingFile() != nullptr) {
    const PartHeader part = *current.PendingFile();
    if (current.ReadFile(directory, state().owner, false, path) == QELO_UPLOAD_DONE) {
      loaded.push_back({freeName(part.field, taken), part.fileName});
    }
  }
  return current.Result();
}

int keepAll(Upload& current, const std::vector<LoadedFile>& loaded, QLIBSZHASH** parameters,
            QLIBSZHASH** files) {
  std::vector<std::string> paths;
  if (current.KeepFiles(paths) != QELO_UPLOAD_DONE) {
    return current.Result();
  }
  for (size_t at = 0; at < loaded.size(); ++at) {
    // Behind the fields: of two with one name it is the file's that counts.
    if (!intoHash(parameters)(loaded[at].key, loaded[at].name) ||
        !intoHash(files)(loaded[at].key, paths[at])) {
      QLIBCHashRemoveAll(*files);
      return current.Fail(QELO_UPLOAD_NO_MEMORY);
    }
  }
  return current.Result();
}

/// Without a word of which slice of what it is, a file is a whole one.
bool isSlice() {
  return strcasecmp(variable("HTTP_X_TYPE_NAME").c_str(), "SLICEUPLOAD") == 0 &&
         !(variable("HTTP_X_UPLOAD_ID").empty() && variable("HTTP_X_FILE_SIZE").empty() &&
           variable("HTTP_X_SLICE_OFFSET").empty());
}

/// Adds the file that was found to the one that it is a slice of.
/// @param whole  receives that one, when this was the rest of it
int addSlice(Upload& current, const Slice& slice, const char* directory,
             std::unique_ptr<TemporaryFile>& whole) {
  std::unique_ptr<PartialFile> file;
  if (const int fault =
          PartialFile::Open(*state().caller, slice, directory, state().received, file);
      fault != 0) {
    return current.Fail(fault);
  }
  current.ReadInto([&](std::string_view bytes) { return file->Write(bytes); });
  state().received = file->Received();
  if (current.Result() == QELO_UPLOAD_DONE && file->IsWhole()) {
    whole = file->Finish(state().owner);
    return whole != nullptr ? current.Result() : current.Fail(QELO_UPLOAD_NO_FILE);
  }
  return current.Result();
}

/// Loads a body that has one slice, or none: then it asks how much there is.
int loadSlice(Upload& current, const char* directory, QLIBSZHASH** parameters,
              std::vector<LoadedFile>& loaded) {
  const std::optional<Slice> slice = readSlice();
  if (!slice || !state().caller) {
    return current.Fail(QELO_UPLOAD_WRONG_SLICE);
  }
  state().slice = slice;
  if (current.ReadFields(intoHash(parameters)) != QELO_UPLOAD_DONE) {
    return current.Result();
  }
  std::unique_ptr<TemporaryFile> whole;
  if (current.PendingFile() == nullptr) {
    std::unique_ptr<PartialFile> file;
    const int fault = PartialFile::Open(*state().caller, *slice, nullptr, state().received, file);
    return fault != 0 ? current.Fail(fault) : QELO_UPLOAD_PARTIAL;
  }
  const PartHeader part = *current.PendingFile();
  if (addSlice(current, *slice, directory, whole) != QELO_UPLOAD_DONE ||
      current.ReadFields(intoHash(parameters)) != QELO_UPLOAD_DONE) {
    return current.Result();
  }
  if (current.PendingFile() != nullptr) {
    return current.Fail(QELO_UPLOAD_MALFORMED);
  }
  if (whole == nullptr) {
    return QELO_UPLOAD_PARTIAL;
  }
  loaded.push_back({part.field, part.fileName});
  current.Adopt(std::move(whole));
  return current.Result();
}

}  // namespace

extern "C" {

void QeloCgiUploadCallerSet(uid_t uid) {
  state().caller = uid;
}

int QeloCgiUploadSliceGet(unsigned long long* received, unsigned long long* size) {
  if (!state().slice) {
    return 0;
  }
  *received = state().received;
  *size = state().slice->size;
  return 1;
}

void QeloCgiUploadOwnerSet(uid_t uid, gid_t gid) {
  state().owner = FileOwner{uid, gid};
}

long long QeloCgiReadBody(char* buffer, unsigned long long size) {
  State& own = stateOfInput();
  if (own.upload != nullptr) {
    return QELO_UPLOAD_MALFORMED;
  }
  if (!own.body) {
    own.body = bodyOfRequest(std::numeric_limits<uint64_t>::max());
  }
  return own.body->Read(buffer, size);
}

int QeloCgiLoadUploadAll(QLIBSZHASH** parameters, QLIBSZHASH** files, const char* directory, int) {
  Upload& current = upload();
  std::vector<LoadedFile> loaded;
  int result = isSlice() ? loadSlice(current, directory, parameters, loaded)
                         : loadAll(current, directory, parameters, loaded);
  if (result == QELO_UPLOAD_DONE) {
    result = keepAll(current, loaded, parameters, files);
  }
  closeReceived(current);
  return result;
}

int QeloCgiLoadUploadNumParams(QeloCgiContext* context, int, int, unsigned long long positions[2],
                               char* part, int size) {
  Upload& current = upload();
  QLIBSZHASH* hash = nullptr;
  memcpy(&hash, context->block, sizeof hash);
  if (hash == nullptr) {
    return QELO_UPLOAD_NO_MEMORY;
  }
  const int result = current.KeepFields(intoHash(&hash));
  positions[0] = current.Position();
  positions[1] = current.Length();
  if (positions[0] == positions[1] && positions[1] > 0) {
    --positions[0];  // a form without a file is still to be handed out
  }
  copyText(current.PendingFile() != nullptr ? current.PendingFile()->text : "", part, size);
  closeReceived(current);
  return result;
}

int QeloCgiLoadUploadParams(QLIBSZHASH** parameters, QeloCgiUploadProgress progress,
                            QeloCgiUploadState* told, char* part, int partSize, char* field,
                            int fieldSize, char* file, int fileSize) {
  Upload& current = upload();
  current.SetProgress(progress);
  *part = *field = *file = '\0';
  if (current.ReadFields(intoHash(parameters)) == QELO_UPLOAD_DONE &&
      current.PendingFile() != nullptr) {
    copyText(current.PendingFile()->text, part, partSize);
    if (!copyText(current.PendingFile()->field, field, fieldSize) ||
        !copyText(current.PendingFile()->fileName, file, fileSize)) {
      *part = *field = *file = '\0';
      current.Fail(QELO_UPLOAD_TOO_LARGE);
    }
  }
  current.SetProgress(nullptr);
  tell(current, *told);
  closeReceived(current);
  return told->result;
}

int QeloCgiLoadUploadFileToDir(QLIBSZHASH** parameters, const char* directory,
                               QeloCgiUploadProgress progress, QeloCgiUploadState* told, char* part,
                               char* field, char* file) {
  Upload& current = upload();
  current.SetProgress(progress);
  std::string path;
  if (current.PendingFile() == nullptr) {
    current.Fail(QELO_UPLOAD_NO_FILE);
  } else if (current.ReadFile(directory, std::nullopt, true, path) == QELO_UPLOAD_DONE &&
             !intoHash(parameters)(field, path)) {
    current.Fail(QELO_UPLOAD_NO_MEMORY);
  }
  *part = *field = *file = '\0';
  current.SetProgress(nullptr);
  tell(current, *told);
  closeReceived(current);
  return told->result;
}

}  // extern "C"
