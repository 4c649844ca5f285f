#pragma once

#include <syslog.h>
#include <unistd.h>

#include <filesystem>
#include <memory>
#include <set>
#include <string>

#include "tests/support/CgiFixture.h"
#include "webapi/SharingChecker.h"
#include "webapi/platform/Paths.h"

namespace QELO {

/// An entry whose operations on sharing links tests may call.
template <typename Base>
class LinkEntry : public Base {
 public:
  using Base::CheckSharingAppPermission;
  using Base::GetSharingCheckFunc;
  using Base::GetSharingCheckLibPath;
  using Base::GetSharingCheckTableFunc;
  using Base::InitSharingSession;
  using Base::OpenSharingCheckLib;
  using Base::RegexMatch;
  using Base::Request;
  using Base::Response;
};

/// Calls of QELO.Test.Good by a link that the fake platform knows; the link's project has a check
/// library, a plugin's copy, once Install() was called.
class Links : public CgiTest {
 protected:
  void SetUp() override {
    CgiTest::SetUp();
    platform->sharingGood = true;
    platform->sharingAuthorized = 1;
    link.id = 5;
    static int tests = 0;  // what was opened once by a path stays open
    link.projectName = "unit" + std::to_string(getpid()) + "." + std::to_string(++tests);
    link.ownerName = "ann";
    link.ownerUid = 1001;
    platform->users[1001] = "ann";
  }

  void TearDown() override {
    for (const std::string& file : installed_) {
      std::filesystem::remove(file);
    }
    CgiTest::TearDown();
  }

  std::string LibraryPath() const { return Paths::kSharingCheckDir + link.projectName + ".so"; }

  /// Makes a plugin the check library of the link's project.
  void Install(const std::string& plugin) {
    std::filesystem::create_directories(Paths::kSharingCheckDir);
    std::filesystem::permissions(Paths::kSharingCheckDir, std::filesystem::perms{0755});
    installed_.insert(LibraryPath());
    std::filesystem::copy_file(std::string(TEST_PLUGIN_DIR "/") + plugin + ".so", LibraryPath(),
                               std::filesystem::copy_options::overwrite_existing);
    std::filesystem::permissions(LibraryPath(), std::filesystem::perms{0644});
  }

  /// Makes the entry's request a call by the link. Empty ids do not come.
  void MakeRequest(const std::string& id = "link", const std::string& sid = "visitor",
                   const std::string& params = "{}", const std::string& method = "echo") {
    platform->sharingEntry = sharing::record::Entry(link);
    platform->sharingSession = session;
    Json::Value environment;
    environment["QELO_REMOTE_IP"] = "192.0.2.7";
    environment["HTTP_COOKIE"] = sid.empty() ? "id=login" : "id=login;sharing_sid=" + sid;
    if (!id.empty()) {
      environment[SZ_X_SHARING_HEADER] = id;
    }
    if (!contentLength.empty()) {
      environment["CONTENT_LENGTH"] = contentLength;
    }
    entry->Request()->InitEnv(environment);
    Json::Value given;
    given["getParam"] = Parse(params);
    given["getParam"]["api"] = "QELO.Test.Good";
    given["getParam"]["version"] = 1;
    given["getParam"]["method"] = method;
    entry->Request()->InitParam(given, false);
    entry->CheckRequestParam(entry->Request(), entry->Response());
    entry->AddAPIInfo(entry->Request());
  }

  /// The full check, with error and stored result, as "passed 0 1".
  std::string Check() {
    const bool passed = entry->CheckSharingPermission(entry->Request(), entry->Response());
    return std::string(passed ? "passed " : "refused ") +
           std::to_string(entry->Response()->GetError()) + " " +
           std::to_string(entry->Request()->GetAuthResult());
  }

  /// The application's check alone, of a call with this parameter "check".
  bool AskApplication(const std::string& check) {
    MakeRequest("link", "visitor", R"({"check": ")" + check + "\"}");
    return entry->CheckSharingAppPermission(entry->Request(), entry->Response());
  }

  /// How many messages there are of this level with this text behind "WebEntry:LINE ".
  static int Logged(int priority, const std::string& text) {
    int count = 0;
    for (const SyslogCapture::Message& message : SyslogCapture::Messages()) {
      const size_t blank = message.text.find(' ');
      count += message.priority == priority && message.text.rfind("WebEntry:", 0) == 0 &&
                       message.text.substr(blank + 1) == text
                   ? 1
                   : 0;
    }
    return count;
  }

  static constexpr char kByLink[] = R"({"allowSharing": true})";
  static constexpr char kUnchecked[] = R"({"allowSharing": true, "skipSharingAppCheck": true})";

  sharing::record::Entry::Fields link;
  sharing::record::Session session{9, 1001, time(nullptr) + 100};
  std::string contentLength;
  std::unique_ptr<LinkEntry<WebEntry>> entry = std::make_unique<LinkEntry<WebEntry>>();

 private:
  std::set<std::string> installed_;
};

}  // namespace QELO
