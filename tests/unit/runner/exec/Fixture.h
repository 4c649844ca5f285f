#pragma once

#include <sys/wait.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <vector>

#include "tests/unit/runner/RunnerFixture.h"
#include "webapi/ExecParam.h"

namespace QELO {

inline constexpr char kEntries[] = "QELO.Test.Entries";
inline constexpr char kDownload[] = "QELO.Test.Download";

/// Calls methods of the libraries "entries", "downloads" and "losing". Version 1 of "entries" runs
/// in a child, version 2 in the process.
class ExecTest : public RunnerTest {
 protected:
  void SetUp() override {
    RunnerTest::SetUp();
    WriteLibDef("{}");
    Describe(kEntries, "entries",
             {"echo", "process", "fail", "large", "deep", "forged", "restart", "silent"});
    Describe(kDownload, "downloads", {"print", "bytes", "bare", "split", "broken", "shared"},
             R"({"allowDownload": true})");
    Describe("QELO.Test.Losing", "losing", {"killed", "ended", "hangsUp", "rubbish", "scalar"});
    unsetenv("QELO_WEBAPI_USERNAME");
    setenv("USERNAME", "before", 1);
  }

  void TearDown() override {
    EXPECT_LT(wait(nullptr), 0) << "a child was left";
    unsetenv("QELO_WEBAPI_USERNAME");
    for (const std::string& file : files_) {
      std::filesystem::remove(file);
    }
    RunnerTest::TearDown();
  }

  void Describe(const std::string& api, const std::string& plugin,
                std::initializer_list<const char*> methods, const std::string& attributes = "{}") {
    Json::Value file;
    Json::Value& description = file[api];
    description = Parse(R"({"minVersion": 1, "maxVersion": 2})");
    description["lib"] = std::string(TEST_PLUGIN_DIR) + "/" + plugin + ".so";
    for (const char* version : {"1", "2"}) {
      for (const char* method : methods) {
        Json::Value listed;
        listed[method] = Parse(attributes);
        if (std::string(version) == "2") {
          listed[method]["grantable"] = true;
        }
        description["methods"][version].append(listed);
      }
    }
    WriteFile(api, JsonHelper::toString(file));
  }

  void WriteFile(const std::string& api, const std::string& text) {
    files_.push_back(Paths::kDescriptionDir + api + ".lib");
    Write(files_.back(), text);
  }

  static ExecParam Call(const std::string& method, int version = 1,
                        const std::string& params = "{}", const std::string& api = kEntries) {
    ExecParam param;
    param.SetParams(Parse(params)).SetAPI(api).SetVersion(version).SetMethod(method);
    return param.SetRunner("alice");
  }

  static Json::Value Failure(int code) {
    Json::Value result;
    result["success"] = false;
    result["error"]["code"] = code;
    return result;
  }

  static std::string Variable(const char* name) {
    const char* value = getenv(name);
    return value != nullptr ? value : "(unset)";
  }

  int Forks() const {
    return static_cast<int>(
        std::count(platform->calls.begin(), platform->calls.end(), "QLIBCProcForkEx(65)"));
  }

 private:
  std::vector<std::string> files_;
};

}  // namespace QELO
