#include <gtest/gtest.h>

#include <string>

#include "tests/unit/model/request/Fixture.h"

using namespace QELO;

namespace {

/// "host port" of this HTTP_HOST; "-" and -1 for what is not known.
std::string hostAndPort(const std::string& host, const std::string& https = "off") {
  Json::Value init;
  init["environ"]["HTTP_HOST"] = host;
  init["environ"]["HTTPS"] = https;
  const APIRequest request(init);
  return request.GetURLHost("-") + " " + std::to_string(request.GetURLPort(-1));
}

/// "path name" of this REQUEST_URI.
std::string pathAndName(const std::string& uri) {
  Json::Value init;
  init["environ"]["REQUEST_URI"] = uri;
  const APIRequest request(init);
  return request.GetURLPath("-") + " " + request.GetURLName("-");
}

int methodCode(const std::string& method) {
  Json::Value init;
  init["environ"]["REQUEST_METHOD"] = method;
  return APIRequest(init).GetRequestMethod();
}

}  // namespace

TEST(RequestMethod, HasACodeForGetPostAndHead) {
  EXPECT_EQ(methodCode("GET"), 1);
  EXPECT_EQ(methodCode("POST"), 2);
  EXPECT_EQ(methodCode("HEAD"), 3);
}

TEST(RequestMethod, IsUnknownForAnyOtherText) {
  for (const char* method : {"get", "post", "Head", "PUT", "DELETE", "GET ", ""}) {
    EXPECT_EQ(methodCode(method), 0) << method;
  }
  EXPECT_EQ(APIRequest().GetRequestMethod(), 0);
}

TEST(UrlProtocol, IsHttpsWhenTheServerSaysOnInAnyCase) {
  for (const char* value : {"ON", "on", "On"}) {
    Json::Value init;
    init["environ"]["HTTPS"] = value;
    EXPECT_EQ(APIRequest(init).GetURLProto("-"), "https") << value;
  }
}

TEST(UrlProtocol, IsHttpForAnyOtherValue) {
  for (const char* value : {"1", "", "off", "ON "}) {
    Json::Value init;
    init["environ"]["HTTPS"] = value;
    EXPECT_EQ(APIRequest(init).GetURLProto("-"), "http") << value;
  }
  EXPECT_EQ(APIRequest().GetURLProto("-"), "http");
}

TEST(UrlProtocol, IsHttpsWhenTheProxySaysSoInAnyCase) {
  EXPECT_EQ(requestWithEnv(R"({"HTTPS":"1","HTTP_X_FORWARDED_PROTO":"HTTPS"})").GetURLProto("-"),
            "https");
  EXPECT_EQ(requestWithEnv(R"({"HTTP_X_FORWARDED_PROTO":"https"})").GetURLProto("-"), "https");
  EXPECT_EQ(requestWithEnv(R"({"HTTP_X_FORWARDED_PROTO":"http"})").GetURLProto("-"), "http");
  EXPECT_EQ(requestWithEnv(R"({"HTTPS":"on","HTTP_X_FORWARDED_PROTO":"http"})").GetURLProto("-"),
            "https");
}

TEST(UrlHost, IsSplitFromThePortAtTheLastColon) {
  EXPECT_EQ(hostAndPort("nas:5001"), "nas 5001");
  EXPECT_EQ(hostAndPort("a:b:7"), "a:b 7");
}

TEST(UrlHost, WithoutPortTakesTheProtocolsOwn) {
  EXPECT_EQ(hostAndPort("nas"), "nas 80");
  EXPECT_EQ(hostAndPort("nas", "on"), "nas 443");
}

TEST(UrlHost, WithABareColonTakesTheProtocolsOwnPort) {
  EXPECT_EQ(hostAndPort("nas:"), "nas 80");
  EXPECT_EQ(hostAndPort("nas:", "on"), "nas 443");
}

TEST(UrlHost, KeepsTheBracketsOfAnIPv6Address) {
  EXPECT_EQ(hostAndPort("[fe80::1]:8080"), "[fe80::1] 8080");
  EXPECT_EQ(hostAndPort("[fe80::1]"), "[fe80::1] 80");
  EXPECT_EQ(hostAndPort("[fe80::1]", "on"), "[fe80::1] 443");
  EXPECT_EQ(hostAndPort("[fe80::1]:"), "[fe80::1] 80");
  EXPECT_EQ(hostAndPort("[a]]x:1"), "[a]] 1");
  EXPECT_EQ(hostAndPort("[a]:1:2"), "[a] -1") << "the port starts at the first colon";
}

TEST(UrlHost, IsUnknownForAnOpenBracketAndAnEmptyHeader) {
  EXPECT_EQ(hostAndPort("[fe80::1"), "- -1");
  EXPECT_EQ(hostAndPort(""), "- -1");
  EXPECT_EQ(APIRequest().GetURLHost("-"), "-");
  EXPECT_EQ(APIRequest().GetURLPort(-1), -1);
}

TEST(UrlPort, IsStoredAsTextAndReadAsADecimalNumber) {
  APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas:0080"})");
  EXPECT_EQ(request.GetURLPort(0), 80);
  EXPECT_EQ(request.Serialize()["url"]["urlPort"], Json::Value("0080"));
}

TEST(UrlPort, OfTheProtocolIsStoredAsText) {
  APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas"})");
  EXPECT_EQ(request.GetURLPort(0), 80);
  EXPECT_EQ(request.Serialize()["url"]["urlPort"], Json::Value("80"));
}

TEST(UrlPort, IsTheDefaultWhenTheTextIsNoPort) {
  EXPECT_EQ(hostAndPort("nas:http"), "nas -1");
  EXPECT_EQ(hostAndPort("nas:80x"), "nas -1");
  EXPECT_EQ(hostAndPort("nas:-5"), "nas -1");
  EXPECT_EQ(hostAndPort("nas:99999999999"), "nas -1");
}

TEST(UrlPath, IsCutAtTheQueryAndSplitAfterTheLastSlash) {
  EXPECT_EQ(pathAndName("/webapi/entry.cgi?api=x"), "/webapi/ entry.cgi");
  EXPECT_EQ(pathAndName("/webapi/entry.cgi?path=/a/b?c"), "/webapi/ entry.cgi");
  EXPECT_EQ(pathAndName("/a//b/c"), "/a//b/ c");
}

TEST(UrlPath, MayEndWithoutAName) {
  EXPECT_EQ(pathAndName("/webapi/"), "/webapi/ ");
  EXPECT_EQ(pathAndName("/?/x"), "/ ");
}

TEST(UrlPath, IsUnknownWithoutASlash) {
  EXPECT_EQ(pathAndName("entry.cgi"), "- -");
  EXPECT_EQ(pathAndName("entry.cgi?a=/"), "- -");
  EXPECT_EQ(pathAndName(""), "- -");
}

TEST(UrlParsing, HappensOnceOnTheFirstQuery) {
  APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas:1","REQUEST_URI":"/a/b","HTTPS":"on"})");
  EXPECT_FALSE(request.Serialize()["url"].isMember("initialized"));
  EXPECT_EQ(request.GetURLHost("-"), "nas");
  EXPECT_EQ(request.Serialize()["url"]["initialized"], Json::Value(true));
  request.InitEnv(json(R"({"HTTP_HOST":"other:2","REQUEST_URI":"/c/d","HTTPS":"off"})"));
  EXPECT_EQ(request.GetURLHost("-"), "nas");
  EXPECT_EQ(request.GetURLPort(-1), 1);
  EXPECT_EQ(request.GetURLPath("-"), "/a/");
  EXPECT_EQ(request.GetURLName("-"), "b");
  EXPECT_EQ(request.GetURLProto("-"), "https");
}

TEST(UrlParsing, IsNotTriedAgainAfterItFailed) {
  APIRequest request;
  EXPECT_EQ(request.GetURLPath("-"), "-");
  request.InitEnv(json(R"({"HTTP_HOST":"nas","REQUEST_URI":"/a/b"})"));
  EXPECT_EQ(request.GetURLPath("-"), "-");
  EXPECT_EQ(request.GetURLHost("-"), "-");
}
