#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include "tests/support/FakePlatform.h"
#include "tests/support/Printed.h"
#include "tests/support/SyslogCapture.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebEntry.h"

namespace QELO {

/// A web entry whose inner operations tests may call.
class TestEntry : public WebEntry {
 public:
  using WebEntry::CheckPermission;
  using WebEntry::DecryptAESParam;
  using WebEntry::DecryptParam;
  using WebEntry::DetectAndDecryptParamLine;
  using WebEntry::InitGetParam;
  using WebEntry::InitParam;
  using WebEntry::InitPostParam;
  using WebEntry::LoadUploadAPIDesc;
  using WebEntry::OutputBody;
  using WebEntry::OutputHeader;
  using WebEntry::ProcessRelay;
  using WebEntry::Request;
  using WebEntry::Response;
};

/// Stands in a description directory of its own with a bare CGI environment, an empty standard
/// input and a fresh fake platform. The API QELO.Test.Good is described by Describe().
class CgiTest : public testing::Test {
 protected:
  void SetUp() override {
    platform = &FakePlatform::Reset();
    SyslogCapture::Clear();
    ClearEnvironment();
    former_ = std::filesystem::current_path();
    std::string pattern = std::filesystem::temp_directory_path() / "entry.XXXXXX";
    directory = mkdtemp(pattern.data());
    std::filesystem::current_path(directory);
    input_ = fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 10);
    GiveInput("");
  }

  void TearDown() override {
    dup2(input_, STDIN_FILENO);
    close(input_);
    std::filesystem::current_path(former_);
    std::filesystem::remove_all(directory);
    ClearEnvironment();
  }

  static void Set(const char* name, const std::string& value) { setenv(name, value.c_str(), 1); }
  static std::string Environment(const char* name) {
    const char* value = getenv(name);
    return value != nullptr ? value : "(unset)";
  }

  /// A GET request with this query string.
  static void Get(const std::string& query) {
    Set("REQUEST_METHOD", "GET");
    Set("QUERY_STRING", query);
  }

  /// A POST request with this body.
  static void Post(const std::string& body) {
    Set("REQUEST_METHOD", "POST");
    Set("CONTENT_LENGTH", std::to_string(body.size()));
    GiveInput(body);
  }

  /// Standard input holds this and ends.
  static void GiveInput(const std::string& text) {
    const int fd = memfd_create("input", MFD_CLOEXEC);
    EXPECT_EQ(write(fd, text.data(), text.size()), static_cast<ssize_t>(text.size()));
    lseek(fd, 0, SEEK_SET);
    dup2(fd, STDIN_FILENO);
    close(fd);
  }

  static std::string RestOfInput() {
    std::string rest;
    char buffer[4096];
    ssize_t count = 0;
    while ((count = read(STDIN_FILENO, buffer, sizeof buffer)) > 0) {
      rest.append(buffer, static_cast<size_t>(count));
    }
    return rest;
  }

  /// What a call prints to standard output.
  template <typename Call>
  static CgiAnswer Printed(Call call) {
    return PrintedBy(call);
  }

  /// The answer of one entry to the request that the environment and standard input hold.
  static CgiAnswer Serve() {
    return PrintedBy([] {
      TestEntry entry;
      entry.Run(Json::Value());
    });
  }

  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value;
  }

  /// Describes QELO.Test.Good: its API-level keys, the attributes of every method, its library.
  static void Describe(const std::string& keys, const std::string& attributes = "{}",
                       const std::string& library = TEST_PLUGIN_DIR "/good.so") {
    Json::Value description = Parse(keys);
    description["lib"] = library;
    description["minVersion"] = 1;
    description["maxVersion"] = 1;
    Json::Value& methods = description["methods"]["1"];
    for (const char* method : {"echo", "whoami", "fail", "silent"}) {
      Json::Value entry;
      entry[method] = Parse(attributes);
      methods.append(entry);
    }
    Json::Value file;
    file["QELO.Test.Good"] = description;
    std::ofstream("QELO.Test.Good.lib") << JsonHelper::toString(file);
  }

  /// How often an operation of the platform was called.
  int Calls(const std::string& operation) const {
    int count = 0;
    for (const std::string& call : platform->calls) {
      count += call.rfind(operation + "(", 0) == 0 ? 1 : 0;
    }
    return count;
  }

  FakePlatform* platform = nullptr;
  std::filesystem::path directory;

 private:
  static void ClearEnvironment() {
    for (const char* name :
         {"REQUEST_METHOD", "QUERY_STRING", "CONTENT_LENGTH", "CONTENT_TYPE", "HTTP_COOKIE",
          "HTTP_X_QELO_SHARING", "HTTP_X_TYPE_NAME", "HTTP_TUS_RESUMABLE", "HTTP_TRANSFER_ENCODING",
          "HTTP_HOST", "QELO_REMOTE_IP", "QELO_WEBAPI_USERNAME", "qeloAccessToken",
          "in_qeloapid"}) {
      unsetenv(name);
    }
  }

  std::filesystem::path former_;
  int input_ = -1;
};

}  // namespace QELO
