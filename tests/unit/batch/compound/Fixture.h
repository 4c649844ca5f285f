#pragma once

#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <memory>
#include <string>

#include "tests/unit/batch/ChildProcess.h"
#include "tests/unit/runner/RunnerFixture.h"
#include "webapi/CompoundHandler.h"

namespace QELO {

/// Compound requests whose entries are methods of the libraries "entries" and "losing". In
/// version 1 of QELO.Test.Entries, as in QELO.Test.Losing, they run in a child, in version 2 in
/// the handler's process.
class CompoundTest : public RunnerTest {
 protected:
  void SetUp() override {
    RunnerTest::SetUp();
    std::filesystem::permissions(directory, static_cast<std::filesystem::perms>(0755));
    WriteLibDef("{}");
    DescribeEntries();
    WriteDescription(Listing("losing",
                             {"killed", "ended", "hangsUp", "rubbish", "nothing", "scalar", "cut",
                              "aborted", "orphaned"},
                             R"({"1": {}})"),
                     "QELO.Test.Losing");
    Json::Value entry = Parse(R"({"lib": "", "minVersion": 1, "maxVersion": 1})");
    entry["methods"]["1"][0] = "request";
    WriteDescription(entry, "QELO.Entry.Request");
    log_ = memfd_create("log", MFD_CLOEXEC);
    SyslogCapture::Copy() = log_;
  }

  void TearDown() override {
    while (wait(nullptr) > 0) {
    }
    SyslogCapture::Copy() = -1;
    close(log_);
    RunnerTest::TearDown();
  }

  static void DescribeEntries() {
    WriteDescription(
        Listing("entries",
                {"echo", "process", "fail", "large", "slow", "deep", "mark", "found", "restart",
                 "silent", "later", "refused", "upload", "download", "descriptors"},
                R"({"1": {}, "2": {"grantable": true}})"),
        "QELO.Test.Entries");
  }

  /// A description of these methods in the versions, each with its attributes; "upload" and
  /// "download" have theirs on top.
  static Json::Value Listing(const std::string& plugin, std::initializer_list<const char*> methods,
                             const std::string& versions) {
    Json::Value description = Parse(R"({"minVersion": 1, "maxVersion": 2})");
    description["lib"] = std::string(TEST_PLUGIN_DIR) + "/" + plugin + ".so";
    const Json::Value attributes = Parse(versions);
    for (const std::string& version : attributes.getMemberNames()) {
      for (const std::string method : methods) {
        Json::Value listed;
        listed[method] = attributes[version];
        if (method == "upload" || method == "download") {
          listed[method][method == "upload" ? "allowUpload" : "allowDownload"] = true;
        }
        description["methods"][version].append(listed);
      }
    }
    return description;
  }

  /// One entry; `more` is an object of further parameters.
  static Json::Value Entry(const std::string& method, int version = 1,
                           const std::string& more = "{}",
                           const std::string& api = "QELO.Test.Entries") {
    Json::Value entry = Parse(more);
    entry["api"] = api;
    entry["version"] = version;
    entry["method"] = method;
    return entry;
  }

  static Json::Value List(std::initializer_list<Json::Value> entries) {
    Json::Value list(Json::arrayValue);
    for (const Json::Value& entry : entries) {
      list.append(entry);
    }
    return list;
  }

  /// Makes the outer request and its runner.
  void Prepare(const Json::Value& compound, const std::string& more = "{}") {
    Json::Value params = Parse(more);
    params["compound"] = compound;
    MakeRequest("QELO.Entry.Request", 1, "request", params);
    if (runner == nullptr) {
      runner = std::make_unique<TestRunner>();
    }
  }

  /// Runs a compound request with a handler of its own. @return its "result"
  Json::Value RunCompound(const Json::Value& compound, const std::string& more = "{}") {
    Prepare(compound, more);
    succeeded = CompoundHandler(request.get(), response.get(), runner.get()).Process();
    return Data()["result"];
  }

  bool HasFail() const { return Data()["has_fail"].asBool(); }

  /// An entry's error code, 0 for success, -1 for neither.
  static int Code(const Json::Value& result) {
    if (JsonHelper::asBool(JsonHelper::member(result, "success"))) {
      return 0;
    }
    return JsonHelper::asInt(JsonHelper::member(JsonHelper::member(result, "error"), "code"), -1);
  }

  /// The messages of this and all child processes, "<priority>text" a line.
  std::string Log() const {
    std::string text(static_cast<size_t>(lseek(log_, 0, SEEK_END)), '\0');
    EXPECT_EQ(pread(log_, text.data(), text.size(), 0), static_cast<ssize_t>(text.size()));
    return text;
  }

  /// How many of them contain the text.
  int Logged(const std::string& part) const {
    const std::string text = Log();
    int count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
      ++count;
    }
    return count;
  }

  static double Seconds() {
    return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch())
        .count();
  }

  static constexpr char kParallel[] = R"({"mode": "parallel"})";
  static constexpr char kStop[] = R"({"stop_when_error": true})";

  bool succeeded = false;

 private:
  int log_ = -1;
};

}  // namespace QELO
