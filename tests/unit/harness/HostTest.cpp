// The made-up host: what methods find there, and what tests learn of a call.

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>
#include <webapi/testing/TestHost.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <sstream>

namespace {

using QELO::TestAnswer;
using QELO::TestHost;

constexpr char kApi[] = "QELO.Test.Sample";

class Host : public testing::Test {
 protected:
  Host() {
    EXPECT_TRUE(host.Describe(API_DIR "/QELO.Test.Sample.lib"));
    host.AddUser("alice", 1001);
    host.AddUser("boss", 1002, true);
    host.AddUser("keeper", 1003);
    host.LogIn("alice");
  }

  TestAnswer Call(const std::string& method, const TestHost::Params& params = {}) {
    return host.Call(kApi, 1, method, params);
  }

  TestHost host;
};

TEST_F(Host, CallerIsWhoLoggedIn) {
  const TestAnswer answer = Call("who");
  EXPECT_TRUE(answer.IsSuccess()) << answer;
  EXPECT_EQ(answer.Data()["user"], "alice");
  EXPECT_EQ(answer.Data()["admin"], false);
  EXPECT_EQ(answer.Data()["address"], "192.0.2.7");
  EXPECT_EQ(answer.Data()["preferences"], host.PreferenceDirectory("alice"));
  host.LogIn("boss", "2001:db8::1");
  EXPECT_EQ(Call("who").Data()["admin"], true);
  EXPECT_EQ(Call("who").Data()["address"], "2001:db8::1");
}

TEST_F(Host, NobodyIsRefusedAsTheDescriptionSays) {
  host.LogOut();
  const TestAnswer answer = Call("who");
  EXPECT_EQ(answer.Code(), 105);
  EXPECT_FALSE(answer.isCalled);
  EXPECT_EQ(answer.account, "");
  EXPECT_EQ(answer.Header("x-request-error"), "noprivilege");
}

TEST_F(Host, DescriptionDecidesWhatMethodsThereAre) {
  EXPECT_EQ(Call("absent").Code(), 103);
  EXPECT_EQ(Call("admins").Code(), 105);
  EXPECT_EQ(host.Call(kApi, 2, "who").Code(), 104);
  EXPECT_EQ(host.Call("QELO.Test.Other", 1, "who").Code(), 102);
  host.LogIn("boss");
  EXPECT_EQ(Call("admins").Code(), 121);  // described, and not in the table
}

TEST_F(Host, MethodRunsAsItsDescriptionSays) {
  EXPECT_EQ(Call("who").account, "system");
  EXPECT_EQ(Call("user").account, "alice");
  EXPECT_EQ(Call("root").account, "root");
  EXPECT_EQ(Call("other").account, "keeper");
  const TestAnswer answer = Call("user");
  EXPECT_EQ(answer.uid, 1001U);
  EXPECT_EQ(answer.gid, 1001U);
  EXPECT_EQ(answer.Data()["uid"], 1001);
  EXPECT_EQ(answer.Data()["gid"], 1001);
  EXPECT_EQ(host.HasLogged("setresuid"), true);  // root's rights are taken for it
}

TEST_F(Host, IdsAreTheRealOnesBetweenCalls) {
  const uid_t before = geteuid();
  Call("user");
  EXPECT_EQ(geteuid(), before);
}

TEST_F(Host, ApplicationPrivilegeCanBeMissing) {
  Json::Value description;
  description["minVersion"] = description["maxVersion"] = 1;
  description["allowUser"].append("normal.local");
  description["appPriv"] = "QELO.App";
  description["methods"]["1"].append("who");
  host.Describe(kApi, description);
  EXPECT_TRUE(Call("who").IsSuccess());
  host.SetAppPrivilege(false);
  EXPECT_EQ(Call("who").Code(), 160);
}

TEST_F(Host, ParametersComeAsOnTheWire) {
  EXPECT_EQ(host.CallLine(kApi, 1, "echo", "text=a%20b").Data(), "a b");
  EXPECT_EQ(host.CallLine(kApi, 1, "echo", "text=12345").Data(), "12345");
  EXPECT_EQ(Call("echo", {{"text", "12&=%5"}}).Data(), "12&=%5");
  const TestAnswer refused = Call("echo", {{"text", ""}});
  EXPECT_EQ(refused.Code(), 101);
  EXPECT_EQ(refused.Errors()[0]["path"], "/text");
  EXPECT_TRUE(refused.isCalled);
}

TEST_F(Host, DeclaredParametersAreReadAndCheckedBeforeTheMethod) {
  Json::Value text;
  text["type"] = "string";
  text["maxLength"] = 5;
  Json::Value method;
  method["echo"]["params"]["type"] = "object";
  method["echo"]["params"]["properties"]["text"] = text;
  Json::Value description;
  description["minVersion"] = description["maxVersion"] = 1;
  description["allowUser"].append("normal.local");
  description["methods"]["1"].append(method);
  host.Describe(kApi, description);
  EXPECT_EQ(host.CallLine(kApi, 1, "echo", "text=1.50").Data(), "1.50");
  EXPECT_EQ(host.CallLine(kApi, 1, "echo", "text=null").Data(), "null");
  for (const char* given : {"Ann", "5", "\"5\""}) {
    EXPECT_EQ(Call("echo", {{"text", given}}).Data(), given);
  }
  const TestAnswer refused = host.CallLine(kApi, 1, "echo", "text=123456");
  EXPECT_EQ(refused.Code(), 101);
  EXPECT_EQ(refused.Errors()[0]["rule"], "maxLength");
  EXPECT_FALSE(refused.isCalled);
}

TEST_F(Host, HeadersAndCookiesAreThere) {
  const TestAnswer answer = Call("echo", {{"text", "hi"}});
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.Header("x-text"), "hi");
  EXPECT_EQ(answer.Header("Set-Cookie"), "last=hi; path=/");
  EXPECT_EQ(answer.Header("Content-type"), "application/json; charset=\"UTF-8\"");
  EXPECT_EQ(answer.Header("X-Absent"), "");
}

TEST_F(Host, VariablesReachTheRequest) {
  host.SetVariable("HTTP_USER_AGENT", "Test/1.0");
  EXPECT_EQ(Call("who").Data()["agent"], "Test/1.0");
}

TEST_F(Host, ChecksOfTheLibraryAreAsked) {
  const TestAnswer answer = Call("now", {{"forbidden", true}});
  EXPECT_EQ(answer.Code(), 105);
  EXPECT_FALSE(answer.isCalled);
}

TEST_F(Host, ClockOfTheDayStands) {
  host.SetClock(1234567890);
  EXPECT_EQ(Call("now").Data(), 1234567890);
  EXPECT_EQ(std::chrono::system_clock::now().time_since_epoch().count() / 1000000000, 1234567890);
  host.SetClock(0);
  EXPECT_GT(Call("now").Data().asInt64(), 1700000000);
}

TEST_F(Host, UploadArrivesOnceAndGoes) {
  host.AddUpload("file", "book.csv", "name\nAnn\n");
  const TestAnswer answer = Call("take");
  EXPECT_EQ(answer.Data()["name"], "book.csv") << answer;
  EXPECT_EQ(answer.Data()["size"], 9);
  EXPECT_EQ(answer.Data()["content"], "name\nAnn\n");
  EXPECT_FALSE(std::filesystem::exists(answer.Data()["path"].asString()));
  EXPECT_EQ(Call("take").Code(), 101);
  host.AddUpload("file", "a", "b");
  EXPECT_EQ(Call("who").Code(), 115);
}

TEST_F(Host, DownloadIsTheBody) {
  const TestAnswer answer = Call("give");
  EXPECT_EQ(answer.body, "a,b\r\n\r\nc");
  EXPECT_EQ(answer.Header("Content-Type"), "text/csv");
  EXPECT_EQ(answer.Header("Content-Disposition"), "attachment; filename=\"table.csv\"");
  EXPECT_EQ(answer.Code(), -1);
}

TEST_F(Host, BackgroundWorkIsWaitedFor) {
  const TestAnswer answer = Call("work");
  EXPECT_EQ(answer.Data()["task_id"], "alice/sample_id1") << answer;
  const Json::Value last = host.WaitForTask("alice/sample_id1");
  EXPECT_EQ(last["data"], "done as 900");
  EXPECT_TRUE(host.HasLogged("works"));
  EXPECT_TRUE(host.WaitForTask("alice/absent").isNull());
}

TEST_F(Host, ProcessesCanBeRefused) {
  host.RefuseProcesses(true);
  EXPECT_EQ(Call("work").Code(), 110);
}

TEST_F(Host, ExceptionsAreLogged) {
  EXPECT_EQ(Call("throw").Code(), 117);
  EXPECT_TRUE(host.HasLogged("method threw an exception: lost"));
  EXPECT_FALSE(host.HasLogged("something else"));
}

TEST_F(Host, FailedTestsShowTheAnswer) {
  std::ostringstream text;
  text << Call("echo", {{"text", "hi"}});
  EXPECT_NE(text.str().find("status 200\n"), std::string::npos);
  EXPECT_NE(text.str().find("X-Text: hi"), std::string::npos);
}

TEST(HostAlone, KnowsNoFileThatIsNone) {
  TestHost host;
  EXPECT_FALSE(host.Describe("/nonexistent.lib"));
  EXPECT_FALSE(host.Describe(__FILE__));
}

TEST(HostAlone, RefusesTheSharedLibraryBesideIt) {
  std::FILE* program = popen("exec " LINKED_TWICE " 2>&1", "r");
  ASSERT_NE(program, nullptr);
  char text[256] = "";
  EXPECT_NE(std::fgets(text, sizeof text, program), nullptr);
  EXPECT_STREQ(text, "link webapi::testing in place of webapi::webapi, not beside it\n");
  const int status = pclose(program);
  EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGABRT) << status;
}

TEST(HostAlone, LeavesNothing) {
  std::string directory;
  pid_t worker = 0;
  {
    TestHost host;
    host.Describe(API_DIR "/QELO.Test.Sample.lib");
    host.AddUser("alice", 1001);
    host.LogIn("alice");
    directory = host.Directory();
    EXPECT_EQ(host.Call(kApi, 1, "endless").Data()["task_id"], "alice/id1");
    for (const std::string& line : host.Log()) {
      const size_t found = line.find("endless as process ");
      worker = found == std::string::npos ? worker : std::atoi(line.c_str() + found + 19);
    }
  }
  ASSERT_GT(worker, 0);
  EXPECT_EQ(kill(worker, 0), -1);
  EXPECT_FALSE(std::filesystem::exists(directory));
}

}  // namespace
