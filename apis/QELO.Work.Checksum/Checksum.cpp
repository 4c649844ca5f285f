// QELO.Work.Checksum: the SHA-256 of every file below a directory, as a background task.

#include <fcntl.h>
#include <unistd.h>
#include <webapi/APIPolling.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>
#include <webapi/WebAPIError.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <string>

#include "Digest.h"
#include "Report.h"
#include "Tree.h"

namespace {

using QELO::APIParameter;
using QELO::APIPolling;
using QELO::APIRequest;
using QELO::APIResponse;

constexpr char kPrefix[] = "checksum_";
constexpr int kMostRunning = 4;     ///< tasks of a user at once
constexpr int kLimitReached = 507;  ///< of APIPolling
constexpr int kNiceness = 10;

enum Error : int { kUnreadable = 400, kTooMany = 401 };

struct Job {
  std::string directory;
  bool oneFileSystem = false;
};

/// The directory as the file system knows it. @return 0, or errno
int FindDirectory(const std::string& path, std::string& directory) {
  char resolved[PATH_MAX];
  if (path.find('\0') != std::string::npos || realpath(path.c_str(), resolved) == nullptr) {
    return path.find('\0') != std::string::npos ? EINVAL : errno;
  }
  const int fd = open(resolved, O_RDONLY | O_DIRECTORY | O_NONBLOCK | O_CLOEXEC);
  if (fd < 0) {
    return errno;
  }
  close(fd);
  directory = resolved;
  return 0;
}

void Work(APIRequest*, APIResponse* response, void* arg) {
  const Job& job = *static_cast<const Job*>(arg);
  [[maybe_unused]] const int niceness = nice(kNiceness);  // people at work go first
  const checksum::Tree tree(job.directory, job.oneFileSystem);
  checksum::Report report(response, job.directory);
  tree.Walk([&](const checksum::File& file) { report.Found(file.size); },
            [](const std::string&, int) {});  // told when it is read
  report.StartReading();
  tree.Walk(
      [&](const checksum::File& file) {
        report.Reading(file.name);
        std::string digest;
        const int error = checksum::digestOf(
            file.path, [&](uint64_t bytes) { report.ReadBytes(bytes); }, digest);
        if (error == 0) {
          report.Done(file.name, digest);
        } else {
          report.Failed(file.name, error);
        }
      },
      [&](const std::string& name, int error) { report.Failed(name, error); });
  report.Finish();
}

void Start(APIRequest* request, APIResponse* response) {
  const APIParameter<std::string> path = request->GetAndCheckString("path");
  const APIParameter<bool> oneFileSystem =
      request->GetAndCheckBool("one_file_system", APIRequest::PARAM_OPTIONAL);
  if (path.IsInvalid() || path.Get().empty() || path.Get()[0] != '/' || oneFileSystem.IsInvalid()) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
    return;
  }
  Job job;
  job.oneFileSystem = oneFileSystem.Get(false);
  if (const int error = FindDirectory(path.Get(), job.directory); error != 0) {
    Json::Value errors(Json::objectValue);
    char text[256] = "";
    errors["reason"] = strerror_r(error, text, sizeof text);
    response->SetError(kUnreadable, errors);
    return;
  }
  APIPolling polling(request);
  polling.SetPrefixAttr(kPrefix);
  polling.SetRemoveAttr(false);  // the result is there to be fetched
  polling.SetLimit(kMostRunning);
  if (!polling.Start(response, Work, &job) && polling.GetError() == kLimitReached) {
    response->SetError(kTooMany);
  }
}

QELO::_tag_API_TABLE table[] = {
    {"QELO.Work.Checksum", 1, "start", Start},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
