// Calls that another host serves: what is asked of it, and what the client gets.

#include "tests/support/CgiFixture.h"
#include "webapi/base/TakenBody.h"

namespace QELO {
namespace {

constexpr char kCall[] = "api=QELO.Test.Good&version=1&method=echo&_sid=S";

class EntryRelay : public CgiTest {
 protected:
  void SetUp() override {
    CgiTest::SetUp();
    platform->authorized = 1;
    platform->authorizedUser = "ann";
    platform->relayAnswer = "{\"success\":true, \"data\":\"\xff there\"}";
    Describe("{}");  // nobody may call it here
    TakenBodyBytes() = 0;
  }
  void TearDown() override {
    TakenBodyBytes() = 0;
    CgiTest::TearDown();
  }

  /// The recorded calls of the manager, one a line.
  std::string Steps() const {
    std::string steps;
    for (const std::string& call : platform->calls) {
      for (const char* name : {"CredRequestMgr(", "~CredRequestMgr(", "AddWebAPIRequest(",
                               "AddRelayRequest(", "GetRequest(", "Run("}) {
        steps += call.rfind(name, 0) == 0 ? call + "\n" : "";
      }
    }
    return steps;
  }

  static void GetRelayed(const std::string& more) { Get(kCall + std::string("&") + more); }

  static std::string Queued(const std::string& host, const std::string& more = "") {
    return "CredRequestMgr()\nAddWebAPIRequest(" + host +
           ", QELO.Test.Good, 1, echo, {\"_sid\":\"S\",\"api\":\"QELO.Test.Good\"," +
           "\"method\":\"echo\"," + more + "\"version\":1})\n";
  }
};

constexpr char kRun[] = "Run(0)\n~CredRequestMgr()\n";

TEST_F(EntryRelay, AnswerIsPrintedAsItCameBehindOurHeader) {
  GetRelayed("relay_zt=7");
  const CgiAnswer answer = Serve();
  EXPECT_EQ(answer.Body(), platform->relayAnswer);
  EXPECT_TRUE(answer.HasLine("Content-type: application/json; charset=\"UTF-8\""));
  EXPECT_TRUE(answer.HasLine("Pragma: no-cache"));
  EXPECT_EQ(answer.text.find("Pragma"), answer.text.rfind("Pragma"));
  EXPECT_EQ(Steps(), Queued("7") + kRun);
}

TEST_F(EntryRelay, EmptyAnswerIsOne) {
  platform->relayAnswer = "";
  GetRelayed("relay_zt=7");
  const CgiAnswer answer = Serve();
  EXPECT_TRUE(answer.HasLine("Pragma: no-cache"));
  EXPECT_EQ(answer.Body(), "");
}

TEST_F(EntryRelay, HeadersAndCookiesOfTheResponseGoAlong) {
  GetRelayed("relay_zt=7");
  TestEntry entry;
  ASSERT_TRUE(entry.Initialize(Json::Value()));
  entry.Response()->SetHeader("X-Mine", "yes");
  entry.Response()->AddCookie("c", "1");
  bool relayed = false;
  const CgiAnswer answer =
      Printed([&] { relayed = entry.ProcessRelay(entry.Request(), entry.Response()); });
  EXPECT_TRUE(relayed);
  EXPECT_FALSE(entry.Response()->IsEnableOutput());
  EXPECT_TRUE(answer.HasLine("X-Mine: yes"));
  EXPECT_NE(answer.Head().find("Set-Cookie: c=1"), std::string::npos);
  EXPECT_EQ(answer.Body(), platform->relayAnswer);
}

TEST_F(EntryRelay, HostIsA64BitNumber) {
  GetRelayed("relay_zt=9223372036854775807");
  Serve();
  EXPECT_EQ(Steps(), Queued("9223372036854775807") + kRun);
  for (const char* none : {"", "abc", "9223372036854775808", "[1]", "null"}) {
    platform->calls.clear();
    GetRelayed(std::string("relay_zt=") + none);
    Serve();
    EXPECT_EQ(Steps(), Queued("0") + kRun) << none;
  }
  platform->calls.clear();
  GetRelayed("relay_zt=-3");
  Serve();
  EXPECT_EQ(Steps(), Queued("-3") + kRun);
}

TEST_F(EntryRelay, TimeoutIsSetAndNotSent) {
  GetRelayed("relay_zt=7&relay_timeout=12&x=1");
  Serve();
  EXPECT_EQ(Steps(), Queued("7").replace(Queued("7").rfind("\"version\":1})"), 13,
                                         "\"version\":1,\"x\":1})") +
                         "GetRequest(0)\nRun(12)\n~CredRequestMgr()\n");
}

TEST_F(EntryRelay, TimeoutsThatAreNoneLeaveTheDefault) {
  for (const char* none : {"0", "-1", "", "soon", "2147483648"}) {
    platform->calls.clear();
    GetRelayed(std::string("relay_zt=7&relay_timeout=") + none);
    Serve();
    EXPECT_EQ(Steps(), Queued("7") + kRun) << none;
  }
}

TEST_F(EntryRelay, PostedCallIsRelayedToo) {
  Post(std::string(kCall) + "&relay_zt=7");
  EXPECT_EQ(Serve().Body(), platform->relayAnswer);
  EXPECT_EQ(Steps(), Queued("7") + kRun);
}

TEST_F(EntryRelay, UploadPassesItsBodyOn) {
  Describe("{}", R"({"allowUpload": true})");
  const std::string body = "--b\r\nthe body\r\n--b--\r\n";
  Post(body);
  Set("QUERY_STRING", std::string(kCall) + "&relay_zt=7&relay_timeout=5");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=b");
  EXPECT_EQ(Serve().Body(), platform->relayAnswer);
  EXPECT_EQ(platform->relayBody, body);
  std::string expected = Queued("7");
  expected.replace(expected.find("AddWebAPI"), 9, "AddRelay");
  expected.resize(expected.size() - 2);
  EXPECT_EQ(Steps(), expected + ", {\"Content-Length\":\"" + std::to_string(body.size()) +
                         "\",\"Content-Type\":\"multipart/form-data; boundary=b\"}, 0, 0)\n"
                         "GetRequest(0)\nRun(5)\n~CredRequestMgr()\n");
  EXPECT_EQ(RestOfInput(), "");
}

TEST_F(EntryRelay, UploadWhoseBodyWasBegunToBeReadIs109AndNothingIsQueued) {
  Describe("{}", R"({"allowUpload": true})");
  Post("--b\r\nthe body\r\n--b--\r\n");
  Set("QUERY_STRING", std::string(kCall) + "&relay_zt=7");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=b");
  TakenBodyBytes() = 5;
  EXPECT_EQ(Serve().Code(), 109);
  EXPECT_EQ(Steps(), "CredRequestMgr()\n~CredRequestMgr()\n");
  EXPECT_EQ(SyslogCapture::Count("an upload whose body was begun to be read is not relayed"), 1);
}

TEST_F(EntryRelay, UploadToAMethodWithoutIs115) {
  Post("--b--");
  Set("QUERY_STRING", std::string(kCall) + "&relay_zt=7");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=b");
  EXPECT_EQ(Serve().Code(), 115);
  EXPECT_EQ(Steps(), "CredRequestMgr()\n~CredRequestMgr()\n");
}

TEST_F(EntryRelay, FailedQueueIs109WithoutALine) {
  platform->relayIndex = -1;
  GetRelayed("relay_zt=7&relay_timeout=5");
  const CgiAnswer answer = Serve();
  EXPECT_EQ(answer.Code(), 109);
  EXPECT_TRUE(answer.HasLine("Pragma: no-cache"));
  EXPECT_EQ(Steps(), Queued("7") + "~CredRequestMgr()\n");
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(EntryRelay, FailedRunIs109AndLogged) {
  platform->relayRuns = false;
  platform->relayError = 6;
  GetRelayed("relay_zt=7");
  EXPECT_EQ(Serve().Code(), 109);
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
  EXPECT_EQ(SyslogCapture::Messages()[0].text, "WebEntry:733 relay request fail[6]");
}

TEST_F(EntryRelay, ChecksOfTheCallComeFirst) {
  GetRelayed("relay_zt=7&version=2");
  EXPECT_EQ(Serve().Code(), 104);
  GetRelayed("relay_zt=7&method=none");
  EXPECT_EQ(Serve().Code(), 103);
  GetRelayed("relay_zt=7&api=QELO.Nothing");
  EXPECT_EQ(Serve().Code(), 102);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 0);
  EXPECT_EQ(Calls("CredRequestMgr"), 3);
  EXPECT_EQ(Calls("Run"), 0);
}

TEST_F(EntryRelay, CallerWhoMayNotComeInIsRefusedWithoutAWord) {
  const std::pair<int, int> rows[] = {{-8, 150}, {-7, 105}, {-6, 105}, {-5, 119},
                                      {-4, 105}, {-3, 105}, {-2, 105}, {-1, 106},
                                      {0, 105},  {3, 105},  {-9, 105}};
  for (const auto& [result, code] : rows) {
    platform->authorized = result;
    platform->calls.clear();
    SyslogCapture::Clear();
    GetRelayed("relay_zt=7");
    const CgiAnswer answer = Serve();
    EXPECT_EQ(answer.Code(), code) << result;
    EXPECT_EQ(answer.Head().find("x-request-error"), std::string::npos);
    EXPECT_EQ(Steps(), "CredRequestMgr()\n~CredRequestMgr()\n");
    EXPECT_EQ(SyslogCapture::Count("call refused from 192.0.2.7"), 1);
  }
}

TEST_F(EntryRelay, CallerWithoutASessionIsRefusedWhateverTheApiAsks) {
  Describe(R"({"authLevel": 0})", R"({"grantByDefault": true})");
  Get("api=QELO.Test.Good&version=1&method=echo&relay_zt=7");
  EXPECT_EQ(Serve().Code(), 105);
  EXPECT_EQ(Calls("AddWebAPIRequest"), 0);
}

TEST_F(EntryRelay, TimedOutSessionCountsWhereTheApiSkipsTimeouts) {
  for (const auto& [keys, allowance] : {std::pair{"{}", "0"},
                                        {R"({"skipTimeout": true})", "1"},
                                        {R"({"skipTimeout": "yes"})", "0"}}) {
    // The method's own attribute is not asked.
    Describe(keys, R"({"allowTimeout": true})");
    platform->calls.clear();
    GetRelayed("relay_zt=7");
    Serve();
    std::string check;
    for (const std::string& call : platform->calls) {
      check += call.rfind("QeloCgiIsAuthorizedEx(", 0) == 0 ? call : "";
    }
    EXPECT_NE(check.find(std::string(", ") + allowance + ","), std::string::npos) << check;
  }
}

TEST_F(EntryRelay, AccessTokenLetsIn) {
  platform->tokenGrant = 1;
  platform->tokenUser = "tom";
  Get("api=QELO.Test.Good&version=1&method=echo&tid=T&relay_zt=7");
  EXPECT_EQ(Serve().Body(), platform->relayAnswer);
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "tom");
}

TEST_F(EntryRelay, CompoundRequestIsRelayedByASessionAlone) {
  std::ofstream("QELO.Entry.Request.lib")
      << R"({"QELO.Entry.Request": {"lib": "", "minVersion": 1, "maxVersion": 1, "authLevel": 2,
             "methods": {"1": ["request"]}}})";
  const std::string compound =
      "api=QELO.Entry.Request&version=1&method=request&compound=[]&relay_zt=7&";
  Get(compound + "_sid=S");
  EXPECT_EQ(Serve().Body(), platform->relayAnswer);
  platform->tokenGrant = 1;
  platform->tokenUser = "tom";
  platform->calls.clear();
  unsetenv("HTTP_COOKIE");
  Get(compound + "tid=T");
  EXPECT_EQ(Serve().Code(), 119);
  EXPECT_EQ(Steps(), "CredRequestMgr()\n~CredRequestMgr()\n");
  EXPECT_EQ(SyslogCapture::Count("compound requests are not relayed by access token"), 1);
}

TEST_F(EntryRelay, ClientThatIsGoneIsNoFailure) {
  GetRelayed("relay_zt=7");
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  close(ends[0]);
  TestEntry entry;
  ASSERT_TRUE(entry.Initialize(Json::Value()));
  fflush(stdout);
  const Redirection output(STDOUT_FILENO, ends[1]);
  EXPECT_TRUE(entry.ProcessRelay(entry.Request(), entry.Response()));
  close(ends[1]);
}

}  // namespace
}  // namespace QELO
