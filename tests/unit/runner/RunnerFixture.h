#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

#include "tests/support/FakePlatform.h"
#include "tests/support/SyslogCapture.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Paths.h"

namespace QELO {

/// A runner whose inner operations tests may call and whose hooks they may set.
class TestRunner : public APIRunner {
 public:
  using APIRunner::CloseLib;
  using APIRunner::GetCheckTableFunc;
  using APIRunner::GetTableFunc;
  using APIRunner::IncreaseCounter;
  using APIRunner::InitEnv;
  using APIRunner::ProcessEntry;
  using APIRunner::ProcessLib;
  using APIRunner::Request;
  using APIRunner::Response;

  bool CheckSharingPermission(APIRequest*, APIResponse*) override {
    asked += "sharing ";
    return sharing;
  }
  bool NeedPermission(APIRequest*) override {
    asked += "need ";
    return need;
  }
  bool CheckPermission(APIRequest*, APIResponse* response) override {
    asked += "check ";
    if (!permission) {
      response->SetError(105);
    }
    return permission;
  }
  bool SkipPermission(APIRequest*) override {
    asked += "skip ";
    return skip;
  }
  bool HandleUpload(APIRequest*, APIResponse*) override {
    asked += "upload ";
    return upload;
  }

  std::string asked;
  bool sharing = true, need = false, permission = true, skip = false, upload = true;
};

/// Stands in a description directory of its own, with a fresh fake platform.
class RunnerTest : public testing::Test {
 protected:
  void SetUp() override {
    platform = &FakePlatform::Reset();
    SyslogCapture::Clear();
    former_ = std::filesystem::current_path();
    std::string pattern = std::filesystem::temp_directory_path() / "runner.XXXXXX";
    directory = mkdtemp(pattern.data());
    std::filesystem::current_path(directory);
    WriteLibDef(R"({"authLevel": 1, "allowUser": ["admin.local"], "priority": 0,
                    "methods": {"allowDemo": true, "byDefault": true}})");
  }

  void TearDown() override {
    std::filesystem::current_path(former_);
    std::filesystem::remove_all(directory);
    std::filesystem::remove(Paths::kLibDef);
  }

  static void Write(const std::string& path, const std::string& text) {
    std::filesystem::create_directories(
        std::filesystem::absolute(std::filesystem::path(path)).parent_path());
    std::ofstream(path) << text;
  }

  /// Read by runners built from then on.
  static void WriteLibDef(const std::string& text) { Write(Paths::kLibDef, text); }

  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value;
  }

  /// A description of versions 1 to 3 of QELO.Test.Call, whose method "run" has the attributes.
  static Json::Value Description(const std::string& plugin, const std::string& attributes = "{}") {
    Json::Value description = Parse(R"({"minVersion": 1, "maxVersion": 3})");
    description["lib"] = std::string(TEST_PLUGIN_DIR) + "/" + plugin + ".so";
    for (const char* version : {"1", "2", "3"}) {
      description["methods"][version][0]["run"] = Parse(attributes);
      description["methods"][version][1] = "stayIdle";
    }
    return description;
  }

  static void WriteDescription(const Json::Value& description,
                               const std::string& api = "QELO.Test.Call") {
    Json::Value file;
    file[api] = description;
    Write(api + ".lib", JsonHelper::toString(file));
  }

  /// Builds the request of a call, with these further parameters.
  void MakeRequest(const std::string& api, int version, const std::string& method,
                   Json::Value params = Json::Value(Json::objectValue)) {
    params["api"] = api;
    params["version"] = version;
    params["method"] = method;
    Json::Value init;
    init["getParam"] = params;
    init["environ"]["REQUEST_METHOD"] = "GET";
    request = std::make_unique<APIRequest>(init);
    response = std::make_unique<APIResponse>(request.get());
  }

  /// Processes "run" of the plugin with the attributes, in a fresh runner.
  bool ProcessPlugin(const std::string& plugin, const std::string& attributes = "{}",
                     int version = 1, const std::string& method = "run") {
    WriteDescription(Description(plugin, attributes));
    MakeRequest("QELO.Test.Call", version, method);
    runner = std::make_unique<TestRunner>();
    return runner->Process(request.get(), response.get());
  }

  /// The answer's "data".
  Json::Value Data() const { return response->GetBody()["data"]; }

  FakePlatform* platform = nullptr;
  std::filesystem::path directory;
  std::unique_ptr<APIRequest> request;
  std::unique_ptr<APIResponse> response;
  std::unique_ptr<TestRunner> runner;

 private:
  std::filesystem::path former_;
};

}  // namespace QELO
