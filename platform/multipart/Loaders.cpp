// The loaders of the seam, over the one upload of the process.

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

#include "platform/multipart/SliceIntake.h"
#include "platform/multipart/Upload.h"
#include "platform/settings/Settings.h"
#include "webapi/base/FileIdentity.h"
#include "webapi/base/NullDevice.h"
#include "webapi/base/Number.h"

using namespace QELO::Platform;

namespace {

constexpr uid_t kNobody = static_cast<uid_t>(-1);

/// What a process has of uploads. At its end the files go, also when a method calls exit().
struct State {
  std::unique_ptr<Upload> upload;
  std::optional<Body> body;  ///< one that is no form
  std::optional<FileOwner> owner;
  SliceIntake slices;
  QELO::FileIdentity input;  ///< where standard input leads to while it is this upload's
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
    own.slices.Reset();
    own.input = QELO::FileIdentity(STDIN_FILENO);
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
void closeReceived() {
  const Upload* current = state().upload.get();
  if (current != nullptr && current->IsReceived()) {
    QELO::PutNullOver({STDIN_FILENO}, O_RDONLY);
    state().input = QELO::FileIdentity(STDIN_FILENO);
  }
}

/// Does what a loader does. Without memory the upload has failed, and nothing is thrown at those
/// who call by C's rules.
template <typename Call>
int guarded(Call call) noexcept {
  try {
    return call(upload());
  } catch (const std::exception&) {
    State& own = state();
    return own.upload != nullptr ? own.upload->Fail(QELO_UPLOAD_NO_MEMORY)
                                 : static_cast<int>(QELO_UPLOAD_NO_MEMORY);
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

/// Ends a loader of a method that reads its upload itself. @return the result
int tell(int result, QeloCgiUploadState& told) {
  if (Upload* current = state().upload.get(); current != nullptr) {
    current->SetProgress(nullptr);
    told.total = current->Length();
    told.left = current->Length() - current->Position();
  }
  closeReceived();
  return told.result = result;
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
      return current.Fail(QELO_UPLOAD_NO_MEMORY);
    }
  }
  return current.Result();
}

/// Reads what stands behind a slice that was not the last.
int endSlice(Upload& current, QLIBSZHASH** parameters) {
  if (current.ReadFields(intoHash(parameters)) != QELO_UPLOAD_DONE) {
    return current.Result();
  }
  return current.PendingFile() != nullptr ? current.Fail(QELO_UPLOAD_MALFORMED)
                                          : static_cast<int>(QELO_UPLOAD_PARTIAL);
}

/// Loads a body that has one slice, or none: then it asks how much there is.
int loadSlice(Upload& current, const char* directory, QLIBSZHASH** parameters,
              std::vector<LoadedFile>& loaded) {
  if (const int fault = state().slices.Open(); fault != 0) {
    return current.Fail(fault);
  }
  if (current.ReadFields(intoHash(parameters)) != QELO_UPLOAD_DONE) {
    return current.Result();
  }
  if (current.PendingFile() == nullptr) {
    return QELO_UPLOAD_PARTIAL;
  }
  const PartHeader part = *current.PendingFile();
  std::unique_ptr<TemporaryFile> whole;
  if (state().slices.Add(current, directory, state().owner, whole) != QELO_UPLOAD_DONE) {
    return current.Result();
  }
  const int end = endSlice(current, parameters);
  if (end != QELO_UPLOAD_PARTIAL || whole == nullptr) {
    return end;
  }
  loaded.push_back({part.field, part.fileName});
  current.Adopt(std::move(whole));
  return current.Result();
}

/// At the end of a body without a file: one with slices asks how much there is.
int answerQuestion(Upload& current) {
  SliceIntake& slices = state().slices;
  if (!SliceIntake::IsAsked() || slices.HasAdded()) {
    return current.Result();
  }
  const int fault = slices.Open();
  return fault != 0 ? current.Fail(fault) : static_cast<int>(QELO_UPLOAD_PARTIAL);
}

/// Receives the file that was found for a method that reads its upload itself.
/// @param path  receives its path when it is whole
/// @return a QeloUploadResult
int loadFile(Upload& current, const char* directory, QLIBSZHASH** parameters, std::string& path) {
  if (!SliceIntake::IsAsked()) {
    return current.ReadFile(directory, std::nullopt, true, path);
  }
  std::unique_ptr<TemporaryFile> whole;
  if (state().slices.Add(current, directory, std::nullopt, whole) != QELO_UPLOAD_DONE) {
    return current.Result();
  }
  if (whole == nullptr) {
    return endSlice(current, parameters);
  }
  if (!whole->Keep()) {
    return current.Fail(QELO_UPLOAD_NO_FILE);
  }
  path = whole->Path();
  current.Adopt(std::move(whole));
  return current.Result();
}

}  // namespace

extern "C" {

int QeloCgiUploadCallerSet(uid_t uid) {
  SliceIntake& slices = stateOfInput().slices;
  slices.SetCaller(uid != kNobody ? std::optional(uid) : std::nullopt);
  return uid != kNobody && SliceIntake::IsAsked() ? slices.Open() : 0;
}

int QeloCgiUploadSliceGet(unsigned long long* received, unsigned long long* size) {
  const SliceIntake& slices = state().slices;
  if (!slices.Said()) {
    return 0;
  }
  *received = slices.Received();
  *size = slices.Said()->size;
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
  const int result = guarded([&](Upload& current) {
    std::vector<LoadedFile> loaded;
    const int found = SliceIntake::IsAsked() ? loadSlice(current, directory, parameters, loaded)
                                             : loadAll(current, directory, parameters, loaded);
    return found == QELO_UPLOAD_DONE ? keepAll(current, loaded, parameters, files) : found;
  });
  if (result == QELO_UPLOAD_NO_MEMORY) {
    QLIBCHashRemoveAll(*files);
  }
  state().slices.LetGo();
  closeReceived();
  return result;
}

int QeloCgiLoadUploadNumParams(QeloCgiContext* context, int, int, unsigned long long positions[2],
                               char* part, int size) {
  QLIBSZHASH* hash = nullptr;
  memcpy(&hash, context->block, sizeof hash);
  if (hash == nullptr) {
    return QELO_UPLOAD_NO_MEMORY;
  }
  const int result = guarded([&](Upload& current) {
    current.KeepFields(intoHash(&hash));
    positions[0] = current.Position();
    positions[1] = current.Length();
    if (positions[0] == positions[1] && positions[1] > 0) {
      --positions[0];  // a form without a file is still to be handed out
    }
    copyText(current.PendingFile() != nullptr ? current.PendingFile()->text : "", part, size);
    return current.Result();
  });
  closeReceived();
  return result;
}

int QeloCgiLoadUploadParams(QLIBSZHASH** parameters, QeloCgiUploadProgress progress,
                            QeloCgiUploadState* told, char* part, int partSize, char* field,
                            int fieldSize, char* file, int fileSize) {
  *part = *field = *file = '\0';
  const int result = guarded([&](Upload& current) {
    current.SetProgress(progress);
    if (current.ReadFields(intoHash(parameters)) != QELO_UPLOAD_DONE) {
      return current.Result();
    }
    const PartHeader* pending = current.PendingFile();
    if (pending == nullptr) {
      return answerQuestion(current);
    }
    copyText(pending->text, part, partSize);
    if (copyText(pending->field, field, fieldSize) && copyText(pending->fileName, file, fileSize)) {
      return current.Result();
    }
    *part = *field = *file = '\0';
    return current.Fail(QELO_UPLOAD_TOO_LARGE);
  });
  return tell(result, *told);
}

int QeloCgiLoadUploadFileToDir(QLIBSZHASH** parameters, const char* directory,
                               QeloCgiUploadProgress progress, QeloCgiUploadState* told, char* part,
                               char* field, char* file) {
  const int result = guarded([&](Upload& current) {
    current.SetProgress(progress);
    std::string path;
    const int loaded = current.PendingFile() != nullptr
                           ? loadFile(current, directory, parameters, path)
                           : current.Fail(QELO_UPLOAD_NO_FILE);
    return loaded == QELO_UPLOAD_DONE && !intoHash(parameters)(field, path)
               ? current.Fail(QELO_UPLOAD_NO_MEMORY)
               : loaded;
  });
  *part = *field = *file = '\0';
  return tell(result, *told);
}

}  // extern "C"
