// What is refused before anything is sent, and what a call looks like. That hosts are told from
// others by their certificates is tested with real ones.

#include "webapi/platform/CredRequest.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>

#include "platform/relay/CallText.h"
#include "platform/relay/KnownHosts.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

const std::string kToken(43, 't');

class Relay : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    setenv("QELO_WEBAPI_USERNAME", "admin", 1);
    WriteHost();
  }

  static std::string Entry(const std::string& more = "",
                           const std::string& url = "https://127.0.0.1:1/webapi/entry.cgi") {
    return R"({"url": ")" + url + R"(", "token": ")" + kToken + "\"" + more + "}";
  }
  static void WriteHost(const std::string& entry = Entry()) { WriteFile("{\"7\": " + entry + "}"); }
  static void WriteFile(const std::string& text) { Write("etc/webapi/relay.json", text); }

  /// The error that queueing a call gives; 0 when it was queued.
  static int Queue(long host = 7, const Json::Value& params = Json::objectValue) {
    CredRequestMgr manager;
    SyslogCapture::Clear();
    const int index = manager.AddWebAPIRequest(host, "QELO.A", 1, "get", params);
    EXPECT_EQ(index < 0, manager.GetError() != 0);
    EXPECT_EQ(SyslogCapture::Messages().empty(), index >= 0);
    return manager.GetError();
  }

  /// The same for an upload.
  static int QueueUpload(const std::string& type, const std::string& length,
                         const Json::Value& params = Json::objectValue) {
    CredRequestMgr manager;
    Json::Value headers;
    headers["Content-Type"] = type;
    headers["Content-Length"] = length;
    const int index = manager.AddRelayRequest(7, "QELO.A", 1, "put", params, headers, stdin, 0);
    EXPECT_EQ(index < 0, manager.GetError() != 0);
    return manager.GetError();
  }

  static std::string Reason() {
    return SyslogCapture::Messages().empty() ? "" : SyslogCapture::Messages()[0].text;
  }
};

TEST_F(Relay, HostIsFoundByItsNumber) {
  EXPECT_EQ(Queue(), CRED_REQUEST_OK);
  EXPECT_EQ(Queue(8), CRED_REQUEST_NO_HOST);
  EXPECT_NE(Reason().find("no call of host 8: there is no such host"), std::string::npos);
  EXPECT_EQ(Queue(0), CRED_REQUEST_NO_HOST);
  EXPECT_EQ(Queue(-7), CRED_REQUEST_NO_HOST);
}

TEST_F(Relay, MissingTableHasNoHost) {
  ASSERT_EQ(remove(Path("etc/webapi/relay.json").c_str()), 0);
  EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST);
}

TEST_F(Relay, TableIsItsOwnersAlone) {
  for (const mode_t mode : {0640, 0604, 0620, 0602, 0644}) {
    ASSERT_EQ(chmod(Path("etc/webapi/relay.json").c_str(), mode), 0);
    EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST) << mode;
    EXPECT_NE(Reason().find("others may read or write it"), std::string::npos);
  }
  ASSERT_EQ(chmod(Path("etc/webapi/relay.json").c_str(), 0600), 0);
  ASSERT_EQ(chmod(Path("etc/webapi").c_str(), 0777), 0);
  EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST);
}

TEST_F(Relay, LinkIsNoTable) {
  ASSERT_EQ(rename(Path("etc/webapi/relay.json").c_str(), Path("etc/webapi/other").c_str()), 0);
  ASSERT_EQ(symlink("other", Path("etc/webapi/relay.json").c_str()), 0);
  EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST);
}

TEST_F(Relay, TextThatIsNoTableHasNoHost) {
  for (const char* text : {"", "[]", "{", "7", "{\"7\": 5}", "{\"7\": null}"}) {
    WriteFile(text);
    EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST) << text;
  }
  WriteFile(std::string((1 << 20) + 1, ' '));
  EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST);
}

TEST_F(Relay, EntryThatIsWrongIsNotUsed) {
  for (const char* url :
       {"", "http://a/b", "https://", "HTTPS://a/", "https://a/?x=1", "https://a/#x",
        "https://user@a/", "https://a/ b", "https://a\\\\b/", "file:///etc/passwd"}) {
    WriteHost(Entry("", url));
    EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST) << url;
    EXPECT_NE(Reason().find("its \"url\" is"), std::string::npos) << url;
  }
  for (const char* more :
       {R"(, "token": "short")", R"(, "token": 5)", R"(, "token": "")", R"(, "Pin": "x")",
        R"(, "pin": "md5//x")", R"(, "pin": "sha256// ")", R"(, "pin": ["sha256//x"])",
        R"(, "timeout": 0)", R"(, "timeout": 3601)", R"(, "timeout": "soon")", R"(, "trust": 5)",
        R"(, "trust": "/etc/webapi/none.pem")", R"(, "verify": false)"}) {
    WriteHost(Entry(more));
    EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST) << more;
    EXPECT_NE(Reason().find("no call of host 7: its "), std::string::npos) << more;
  }
}

TEST_F(Relay, EntryGivesWhatItSays) {
  Write("etc/webapi/b.pem", "certificate", 0644);
  WriteHost(Entry(R"(, "trust": "/etc/webapi/b.pem", "pin": "sha256//AAAA", "timeout": 20)"));
  Platform::RelayHost host;
  std::string reason = "before";
  ASSERT_TRUE(Platform::findRelayHost(7, host, reason));
  EXPECT_EQ(host.url, "https://127.0.0.1:1/webapi/entry.cgi");
  EXPECT_EQ(host.token, kToken);
  EXPECT_EQ(host.trust, Path("etc/webapi/b.pem"));
  EXPECT_EQ(host.pin, "sha256//AAAA");
  EXPECT_EQ(host.timeout, 20);
  EXPECT_EQ(reason, "");
  WriteHost();
  ASSERT_TRUE(Platform::findRelayHost(7, host, reason));
  EXPECT_EQ(host.trust, "");
  EXPECT_EQ(host.timeout, 300);
}

TEST_F(Relay, TrustThatOthersMayWriteIsNone) {
  Write("etc/webapi/b.pem", "certificate", 0664);
  WriteHost(Entry(R"(, "trust": "/etc/webapi/b.pem")"));
  EXPECT_EQ(Queue(), CRED_REQUEST_NO_HOST);
  EXPECT_NE(Reason().find("its \"trust\" is missing"), std::string::npos);
}

TEST_F(Relay, AdministratorsAndThoseWithThePrivilegeMayUseAHost) {
  setenv("QELO_WEBAPI_USERNAME", "alice", 1);
  EXPECT_EQ(Queue(), CRED_REQUEST_FORBIDDEN);
  EXPECT_NE(Reason().find("the caller lacks the privilege QELO.Relay.7"), std::string::npos);
  Write("etc/webapi/appprivs.json", R"({"QELO.Relay.7": {"allow": [{"user": "alice"}]}})", 0644);
  EXPECT_EQ(Queue(), CRED_REQUEST_OK);
  setenv("QELO_WEBAPI_USERNAME", "bob", 1);
  EXPECT_EQ(Queue(), CRED_REQUEST_FORBIDDEN);
  for (const char* nobody : {"", "zoe"}) {
    setenv("QELO_WEBAPI_USERNAME", nobody, 1);
    EXPECT_EQ(Queue(), CRED_REQUEST_FORBIDDEN);
  }
  unsetenv("QELO_WEBAPI_USERNAME");
  EXPECT_EQ(Queue(), CRED_REQUEST_FORBIDDEN);
}

TEST_F(Relay, PrivilegeMayAskForAnAddress) {
  setenv("QELO_WEBAPI_USERNAME", "alice", 1);
  Write("etc/webapi/appprivs.json",
        R"({"QELO.Relay.7": {"allow": [{"user": "alice", "address": "192.0.2.0/24"}]}})", 0644);
  EXPECT_EQ(Queue(), CRED_REQUEST_OK);
  setenv("REMOTE_ADDR", "198.51.100.1", 1);
  EXPECT_EQ(Queue(), CRED_REQUEST_FORBIDDEN);
}

TEST_F(Relay, RelayedCallIsNotRelayedAgain) {
  setenv("HTTP_X_QELO_RELAY", "1", 1);
  EXPECT_EQ(Queue(), CRED_REQUEST_LOOP);
  EXPECT_EQ(QueueUpload("multipart/form-data; boundary=b", "5"), CRED_REQUEST_LOOP);
  setenv("HTTP_X_QELO_RELAY", "", 1);
  EXPECT_EQ(Queue(), CRED_REQUEST_OK);
}

TEST_F(Relay, CallsAreBoundInNumberAndLength) {
  CredRequestMgr manager;
  for (int i = 0; i < 16; ++i) {
    EXPECT_EQ(manager.AddWebAPIRequest(7, "QELO.A", 1, "get", Json::objectValue), i);
  }
  EXPECT_LT(manager.AddWebAPIRequest(7, "QELO.A", 1, "get", Json::objectValue), 0);
  EXPECT_EQ(manager.GetError(), CRED_REQUEST_TOO_LARGE);
  Json::Value params;
  params["x"] = std::string(Platform::kLongestCall - 100, 'x');
  EXPECT_EQ(Queue(7, params), CRED_REQUEST_OK);
  params["x"] = std::string(Platform::kLongestCall, 'x');
  EXPECT_EQ(Queue(7, params), CRED_REQUEST_TOO_LARGE);
  params["x"] = std::string(Platform::kLongestQuery, 'x');
  EXPECT_EQ(QueueUpload("a/b", "5", params), CRED_REQUEST_TOO_LARGE);
}

TEST_F(Relay, UploadNeedsALengthAndATypeOfOneLine) {
  EXPECT_EQ(QueueUpload("multipart/form-data; boundary=b", "0"), CRED_REQUEST_OK);
  EXPECT_EQ(QueueUpload("multipart/form-data; boundary=b", "9223372036854775807"), CRED_REQUEST_OK);
  for (const char* length : {"", "-1", "x", "5x", "9223372036854775808", " 5"}) {
    EXPECT_EQ(QueueUpload("a/b", length), CRED_REQUEST_BAD_BODY) << length;
  }
  for (const std::string& type : {std::string(), std::string("a/b\r\nX-Other: 1"),
                                  std::string("a\nb"), std::string(1025, 'x')}) {
    EXPECT_EQ(QueueUpload(type, "5"), CRED_REQUEST_BAD_BODY) << type;
  }
}

TEST_F(Relay, RequestsAreFoundByTheirIndex) {
  CredRequestMgr manager;
  EXPECT_EQ(manager.GetRequest(0), nullptr);
  EXPECT_TRUE(manager.Run());
  ASSERT_EQ(manager.AddWebAPIRequest(7, "QELO.A", 1, "get", Json::objectValue), 0);
  ASSERT_EQ(manager.AddWebAPIRequest(7, "QELO.A", 1, "get", Json::objectValue), 1);
  manager.GetRequest(0)->SetResponseTimeout(5);
  EXPECT_EQ(manager.GetRequest(0)->GetResponseTimeout(), 5);
  EXPECT_EQ(manager.GetRequest(1)->GetResponseTimeout(), 0);
  EXPECT_EQ(manager.GetRequest(2), nullptr);
  EXPECT_EQ(manager.GetRequest(-1), nullptr);
  EXPECT_EQ(manager.GetResponse(0), "");
  EXPECT_EQ(manager.GetResponse(2), "");
  EXPECT_EQ(manager.GetResponse(-1), "");
}

TEST_F(Relay, HostWhereNobodyAnswersIsUnreachable) {
  CredRequestMgr manager;
  ASSERT_EQ(manager.AddWebAPIRequest(7, "QELO.A", 1, "get", Json::objectValue), 0);
  EXPECT_FALSE(manager.Run());
  EXPECT_EQ(manager.GetError(), CRED_REQUEST_UNREACHABLE);
  EXPECT_EQ(manager.GetResponse(0), "");
  EXPECT_EQ(SyslogCapture::Count("no call of host 7: "), 1);
}

TEST_F(Relay, MissingTransportIsAFailure) {
  ASSERT_EQ(remove(Path("modules/relay.so").c_str()), 0);
  CredRequestMgr manager;
  ASSERT_EQ(manager.AddWebAPIRequest(7, "QELO.A", 1, "get", Json::objectValue), 0);
  EXPECT_FALSE(manager.Run());
  EXPECT_EQ(manager.GetError(), CRED_REQUEST_NO_TRANSPORT);
}

TEST(RelayCallText, ReadsAsWhatStoodHere) {
  Json::Value params;
  params["api"] = "other";
  params["version"] = 9;
  params["method"] = "other";
  params["number"] = 5;
  params["text"] = "5";
  params["odd &=%+\xc3\xa4"] = "a&b=c%41+\n\x01\xc3\xa4\"\\";
  params["true"] = "true";
  params["list"].append(5);
  params["list"].append(Json::objectValue);
  params["null"] = Json::nullValue;
  std::string line;
  ASSERT_TRUE(Platform::writeCall("QELO.A", 2, "get", params, 1000, line));
  Json::Value read(Json::objectValue);
  ASSERT_TRUE(WebAPIUtil::strPairToJsonObj(line, read, true, true));
  params["api"] = "QELO.A";
  params["version"] = 2;
  params["method"] = "get";
  EXPECT_EQ(read, params);
}

TEST(RelayCallText, CredentialsStayHere) {
  Json::Value params;
  for (const char* name : {"_sid", "tid", "_sharing_id", "_sharing_sid"}) {
    params[name] = "secret";
  }
  params["_other"] = 1;
  std::string line;
  ASSERT_TRUE(Platform::writeCall("QELO.A", 2, "get", params, 1000, line));
  EXPECT_EQ(line, "api=%22QELO.A%22&version=2&method=%22get%22&_other=1");
}

}  // namespace
}  // namespace QELO
