// Methods that take uploads: as a whole, or part after part.
//
// Tests: upload.py

#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <string>

#include "PluginTable.h"
#include "webapi/APIUpload.h"

constexpr off_t kMostSummed = 32 << 20;  // bytes

/// What stands in a file, or its first bytes, as hexadecimal digits, and whose it is.
static void describeFile(Json::Value& file) {
  struct stat info {};
  const std::string path = file["path"].asString();
  if (lstat(path.c_str(), &info) != 0) {
    return;
  }
  file["mode"] = info.st_mode & 07777U;
  file["uid"] = info.st_uid;
  if (info.st_size > kMostSummed) {
    return;
  }
  std::ifstream stream(path, std::ios::binary);
  unsigned long long sum = 14695981039346656037ULL;  // FNV-1a
  for (std::istreambuf_iterator<char> each(stream), end; each != end; ++each) {
    sum = (sum ^ static_cast<unsigned char>(*each)) * 1099511628211ULL;
  }
  file["sum"] = std::to_string(sum);
}

static Json::Value answerOf(QELO::APIRequest* request) {
  Json::Value data;
  data["files"] = QELO::APIUpload(request).GetFiles();
  for (Json::Value& file : data["files"]) {
    describeFile(file);
  }
  data["euid"] = geteuid();
  return data;
}

/// Answers files and parameters.
static void take(QELO::APIRequest* request, QELO::APIResponse* response) {
  Json::Value data = answerOf(request);
  data["params"] = request->GetParam("");
  response->SetSuccess(data);
}

static unsigned long long lastDone = 0;

/// Reads the upload itself and answers the same.
static void defer(QELO::APIRequest* request, QELO::APIResponse* response) {
  QELO::APIUpload upload(request);
  upload.SetUploadCallback([](unsigned long long done, unsigned long long) { lastDone = done; });
  Json::Value params(Json::objectValue);
  int result = upload.GetUploadParam(params);
  while (result == QELO::APIUpload::DONE && upload.HasFile()) {
    result = upload.GetUploadFile(params);
    if (result == QELO::APIUpload::DONE) {
      result = upload.GetUploadParam(params);
    }
  }
  if (result == QELO::APIUpload::PARTIAL) {
    response->SetSuccess(upload.GetSlice());
    return;
  }
  if (result != QELO::APIUpload::DONE) {
    Json::Value errors = upload.GetSlice();
    errors["upload_err"] = result;
    response->SetError(400, errors);
    return;
  }
  Json::Value data = answerOf(request);
  data["params"] = params;
  data["done"] = Json::UInt64{lastDone};
  response->SetSuccess(data);
}

/// Renames the first file to the path in the environment of the account: its home.
static void keep(QELO::APIRequest* request, QELO::APIResponse* response) {
  const std::string target = request->GetParam("target").asString();
  const Json::Value files = QELO::APIUpload(request).GetFiles();
  if (files.empty() || std::rename(files[0]["path"].asCString(), target.c_str()) != 0) {
    response->SetError(400);
    return;
  }
  response->SetSuccess(Json::Value());
}

static void leave(QELO::APIRequest*, QELO::APIResponse*) {
  exit(0);
}

static void die(QELO::APIRequest*, QELO::APIResponse*) {
  raise(SIGKILL);
}

/// Says that it has begun, by a file of the name that it was given, and waits for its end.
static void wait(QELO::APIRequest* request, QELO::APIResponse*) {
  std::ofstream(request->GetParam("mark").asString()) << getpid();
  sleep(30);
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {
      {"QELO.Test.Upload", 1, "take", take},   {"QELO.Test.Upload", 1, "user", take},
      {"QELO.Test.Upload", 1, "defer", defer}, {"QELO.Test.Upload", 1, "keep", keep},
      {"QELO.Test.Upload", 1, "root", take},   {"QELO.Test.Upload", 1, "wait", wait},
      {"QELO.Test.Upload", 1, "leave", leave}, {"QELO.Test.Upload", 1, "die", die},
      {nullptr, 0, nullptr, nullptr}};
  return table;
}
