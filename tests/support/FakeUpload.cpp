#include "tests/support/FakeUpload.h"

#include <cstdio>
#include <cstring>
#include <new>

#include "tests/support/FakePlatform.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Upload.h"

namespace {

FakeUpload& fake() {
  return FakePlatform::Get().upload;
}

void note(const char* operation) {
  FakePlatform::Get().calls.push_back(std::string(operation) + "()");
}

void fill(const std::map<std::string, std::string>& from, QLIBSZHASH** hash) {
  for (const auto& [name, value] : from) {
    QLIBCSzHashSetValue(hash, name.c_str(), value.c_str());
  }
}

void tell(QeloCgiUploadProgress progress, QeloCgiUploadState* state, int result) {
  if (progress != nullptr && fake().callsBack) {
    progress(1, 2);
  }
  state->left = fake().left;
  state->result = result;
}

}  // namespace

extern "C" {

void QeloCgiUploadOwnerSet(uid_t uid, gid_t gid) {
  fake().owner = uid;
  fake().group = gid;
}

int QeloCgiUploadCallerSet(uid_t uid) {
  FakePlatform::Get().calls.push_back("QeloCgiUploadCallerSet(" +
                                      std::to_string(static_cast<int>(uid)) + ")");
  if (uid != static_cast<uid_t>(-1)) {
    fake().caller = uid;
  }
  return 0;
}

int QeloCgiUploadSliceGet(unsigned long long* received, unsigned long long* size) {
  *received = fake().sliceReceived;
  *size = fake().sliceSize;
  return fake().sliceSize != 0 ? 1 : 0;
}

long long QeloCgiReadBody(char* buffer, unsigned long long size) {
  const std::string piece = fake().body.substr(0, size);
  fake().body.erase(0, size);
  return static_cast<long long>(piece.copy(buffer, piece.size()));
}

int QeloCgiLoadUploadAll(QLIBSZHASH** parameters, QLIBSZHASH** files, const char* directory, int) {
  note("QeloCgiLoadUploadAll");
  fake().directory = directory;
  fill(fake().parameters, parameters);
  fill(fake().files, files);
  if (fake().runsShort) {
    throw std::bad_alloc();
  }
  return fake().all;
}

int QeloCgiLoadUploadNumParams(QeloCgiContext* context, int needed, int reserved,
                               unsigned long long positions[2], char*, int size) {
  FakePlatform::Get().calls.push_back("QeloCgiLoadUploadNumParams(" + std::to_string(needed) +
                                      ", " + std::to_string(reserved) + ", " +
                                      std::to_string(size) + ")");
  QLIBSZHASH* hash = nullptr;
  memcpy(&hash, context->block, sizeof hash);
  fill(fake().parameters, &hash);
  positions[0] = fake().positions[0];
  positions[1] = fake().positions[1];
  return fake().fields;
}

int QeloCgiLoadUploadParams(QLIBSZHASH** parameters, QeloCgiUploadProgress progress,
                            QeloCgiUploadState* state, char* part, int partSize, char* field,
                            int fieldSize, char* file, int fileSize) {
  FakePlatform::Get().calls.push_back("QeloCgiLoadUploadParams(" + std::to_string(partSize) + ", " +
                                      std::to_string(fieldSize) + ", " + std::to_string(fileSize) +
                                      ")");
  fill(fake().parameters, parameters);
  snprintf(part, static_cast<size_t>(partSize), "%s", fake().part.c_str());
  snprintf(field, static_cast<size_t>(fieldSize), "%s", fake().field.c_str());
  snprintf(file, static_cast<size_t>(fileSize), "%s", fake().name.c_str());
  tell(progress, state, fake().params);
  return fake().params;
}

int QeloCgiLoadUploadFileToDir(QLIBSZHASH** parameters, const char* directory,
                               QeloCgiUploadProgress progress, QeloCgiUploadState* state,
                               char* part, char* field, char* file) {
  note("QeloCgiLoadUploadFileToDir");
  fake().directory = directory;
  fill(fake().files, parameters);
  *part = *field = *file = '\0';
  tell(progress, state, fake().file);
  return fake().file;
}

int VolumeAvailGet(unsigned long long size, QELOVolumeRecord* volume) {
  note("VolumeAvailGet");
  fake().wanted = size;
  if (fake().volume.empty()) {
    return 0;
  }
  snprintf(volume->path, sizeof volume->path, "%s", fake().volume.c_str());
  return 1;
}

void QLIBCErrSetEx(int error, const char* file, int) {
  fake().error = error;
  FakePlatform::Get().calls.push_back("QLIBCErrSetEx(" + std::to_string(error) + ", " + file + ")");
}

int QLIBCErrGet(void) {
  return fake().error;
}

}  // extern "C"
