#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/FakePlatform.h"
#include "tests/unit/model/FailingLibc.h"
#include "tests/unit/model/request/Fixture.h"
#include "tests/unit/model/useragent/Fixture.h"
#include "webapi/model/request/APIRequestPrivate.h"

using namespace QELO;

namespace {

constexpr char kPlain[] = "Mobile MobileDevice";

/// Notes each key that is stored, in order, as "key=value", with "!" when only strings were let in.
class WatchedRequest : public APIRequestPrivate {
 public:
  WatchedRequest() : APIRequestPrivate(nullptr) {}

  using APIRequestPrivate::SetData;
  bool SetData(const std::string& section, const std::string& key, const Json::Value& value,
               bool stringOnly) override {
    if (section == "userAgent") {
      stored.push_back(key + "=" + JsonHelper::toString(value) + (stringOnly ? "!" : ""));
    }
    return APIRequestPrivate::SetData(section, key, value, stringOnly);
  }

  std::vector<std::string> stored;
};

Json::Value flagsOf(APIRequest& request) {
  return request.Serialize()["userAgent"];
}

}  // namespace

TEST(UserAgent, FlagsAreKeptInOrderBehindTheMark) {
  WatchedRequest request;
  request.InitEnv(json(R"({"HTTP_USER_AGENT": "iPad AppleWebKit"})"));
  request.InitUA();
  const std::vector<std::string> expected = {
      "initialized=true",    "uaMobile=true",    "uaMobileDevice=true", "uaIPhone=true",
      "uaAndroid=false",     "uaIEMobile=false", "uaIPad=true",         "uaPlayBook=false",
      "uaBlackBerry6=false", "uaWebKit=true",    "uaSupportWebAPP=true"};
  EXPECT_EQ(request.stored, expected);
}

TEST(UserAgent, IsClassifiedByEachOfTheQueries) {
  using Query = bool (APIRequest::*)() const;
  for (const Query query :
       {&APIRequest::IsMobile, &APIRequest::IsMobileDevice, &APIRequest::IsIPhone,
        &APIRequest::IsAndroid, &APIRequest::IsIEMobile, &APIRequest::IsIPad,
        &APIRequest::IsPlayBook, &APIRequest::IsBlackBerry6, &APIRequest::IsWebKit,
        &APIRequest::IsSupportWebApp}) {
    APIRequest request = requestOf("curl");
    EXPECT_EQ(flagsOf(request), json("{}"));
    EXPECT_FALSE((request.*query)());
    EXPECT_EQ(flagsOf(request).size(), 11U);
  }
}

TEST(UserAgent, IsNotLookedAtBeforeItIsAsked) {
  FakePlatform::Reset();
  const FailingLibc libc;
  APIRequest request = requestOf("Opera Mini");
  request.GetURLHost("");
  EXPECT_EQ(libc.compiled, 0);
  EXPECT_EQ(FakePlatform::Get().calls, std::vector<std::string>());
  EXPECT_EQ(flagsOf(request), json("{}"));
}

TEST(UserAgent, WithoutAHeaderMarksTheRequestAndAnswersNo) {
  Json::Value init;
  init["environ"] = json(R"({"HTTP_UA_OS": "x", "HTTP_X_WAP_PROFILE": "y"})");
  APIRequest request(init);
  EXPECT_EQ(devices(request), "");
  EXPECT_EQ(flagsOf(request), json(R"({"initialized": true})"));
}

TEST(UserAgent, WithoutMemoryForACopyMarksTheRequestAndAnswersNo) {
  APIRequest request = requestOf("iPhone AppleWebKit");
  FailingLibc libc;
  libc.strdupFails = true;
  EXPECT_EQ(devices(request), "");
  EXPECT_EQ(flagsOf(request), json(R"({"initialized": true})"));
}

TEST(UserAgent, IsClassifiedOnce) {
  APIRequest request = requestOf("iPhone AppleWebKit");
  EXPECT_TRUE(request.IsIPhone());
  request.InitEnv(json(R"({"HTTP_USER_AGENT": "Android", "HTTP_COOKIE": "forceDesktop=1"})"));
  EXPECT_EQ(devices(request), "Mobile MobileDevice IPhone WebKit SupportWebApp");
}

TEST(UserAgent, TravelsWithTheRecord) {
  APIRequest request = requestOf("iPhone AppleWebKit");
  EXPECT_TRUE(request.IsIPhone());
  const APIRequest copy(request);
  Json::Value record = request.Serialize();
  record["environ"]["HTTP_USER_AGENT"] = "curl";
  APIRequest other;
  other.Deserialize(record);
  EXPECT_EQ(devices(other), devices(request));
  EXPECT_EQ(devices(copy), devices(request));
}

TEST(UserAgent, IsReadFromALowerCasedCopy) {
  FakePlatform::Reset();
  const APIRequest request = requestOf("curl/7 X");
  request.IsMobile();
  EXPECT_EQ(FakePlatform::Get().calls, std::vector<std::string>{"QLIBCStrCaseLower(curl/7 X)"});
  EXPECT_EQ(request.GetEnv("HTTP_USER_AGENT", ""), "curl/7 X");
}

TEST(UserAgent, FirstBrandThatIsNamedCounts) {
  struct {
    const char* text;
    const char* brand;
  } const rules[] = {
      {"ipad iphone ipod android playbook blackberry", "IPhone IPad"},
      {"iphone android playbook blackberry", "IPhone"},
      {"ipod android playbook blackberry", "IPhone"},
      {"android playbook blackberry", "Android"},
      {"playbook blackberry", "PlayBook"},
  };
  for (const auto& rule : rules) {
    const std::string mobile = std::string("Mobile MobileDevice ") + rule.brand;
    EXPECT_EQ(devices(rule.text), mobile) << rule.text;
    EXPECT_EQ(devices("webkit " + std::string(rule.text)), mobile + " WebKit SupportWebApp")
        << rule.text;
  }
}

TEST(UserAgent, BlackBerryHasABrandWithWebKitAlone) {
  EXPECT_EQ(devices("blackberry webkit"), "Mobile MobileDevice BlackBerry6 WebKit SupportWebApp");
  EXPECT_EQ(devices("blackberry"), kPlain);
}

TEST(UserAgent, FallbackNamesAreMobileWithoutABrand) {
  for (const char* text :
       {"SymbianOS", "Windows CE", "PalmOS", "BlackBerry", "Vodafone", "Opera Mobi", "Opera Mini",
        "UP.Browser", "AvantGo", "EudoraWeb", "PLink", "Plucker", "NetFront", "Xiino", "Blazer",
        "WebPro", "ProxiNet", "Elaine"}) {
    EXPECT_EQ(devices(text), kPlain) << text;
    EXPECT_EQ(devices("x" + std::string(text) + "x"), kPlain) << text;
  }
  EXPECT_EQ(devices("UPxBrowser"), "");
  EXPECT_EQ(devices("Windows  CE"), "");
}

TEST(UserAgent, FallbackKeepsTheWebKitFlagAndNoWebApp) {
  EXPECT_EQ(devices("SymbianOS webkit"), "Mobile MobileDevice WebKit");
}

TEST(UserAgent, OtherHeadersOfMobileDevicesCountWhateverTheyHold) {
  for (const char* name : {"HTTP_UA_OS", "HTTP_X_WAP_PROFILE"}) {
    Json::Value init;
    init["environ"]["HTTP_USER_AGENT"] = "something MSIE";
    init["environ"][name] = "";
    EXPECT_EQ(devices(APIRequest(init)), "Mobile MobileDevice IEMobile") << name;
  }
}

TEST(UserAgent, IEMobileIsAMobileDeviceThatNamesOneOfTwoWords) {
  EXPECT_EQ(devices("android MSIE"), "Mobile MobileDevice Android IEMobile");
  EXPECT_EQ(devices("android IEMobile"), "Mobile MobileDevice Android IEMobile");
  EXPECT_EQ(devices("MSIE IEMobile"), "");
}

TEST(UserAgent, DesktopCookieTakesTheMobilePageAway) {
  struct {
    const char* cookie;
    bool mobile;
  } const rules[] = {
      {"1", false},  {"-1", false},         {"007", false},
      {"2x", false}, {"4294967296", false}, {"0", true},
      {"00", true},  {"yes", true},         {"", true},
      {"x1", true},  {"0x10", true},        {"99999999999999999999", false},
  };
  for (const auto& rule : rules) {
    const APIRequest request = requestOf("iphone", std::string("forceDesktop=") + rule.cookie);
    EXPECT_EQ(request.IsMobile(), rule.mobile) << rule.cookie;
    EXPECT_TRUE(request.IsMobileDevice()) << rule.cookie;
    EXPECT_TRUE(request.IsIPhone()) << rule.cookie;
  }
}

TEST(UserAgent, DesktopCookieMakesNoDeviceMobile) {
  EXPECT_EQ(devices(requestOf("curl", "forceDesktop=0")), "");
}

TEST(UserAgent, PatternThatCannotBeCompiledMakesNothingMobile) {
  FailingLibc libc;
  libc.regcompFails = true;
  EXPECT_EQ(devices("Opera Mini"), "");
  EXPECT_EQ(devices("iphone"), "Mobile MobileDevice IPhone");
}

TEST(UserAgent, PatternIsFreed) {
  const FailingLibc libc;
  EXPECT_EQ(devices("Opera Mini"), kPlain);
  EXPECT_EQ(devices("curl"), "");
  EXPECT_EQ(libc.compiled, 2);
  EXPECT_EQ(libc.freed, libc.compiled);
}

TEST(UserAgent, FlagsOfAForeignRecordThatAreNoTruthAnswerNo) {
  APIRequest request = requestOf("iPhone AppleWebKit");
  request.Serialize()["userAgent"] = json(R"({"initialized": 0, "uaMobile": {}, "uaIPad": "x"})");
  EXPECT_EQ(devices(request), "");
}
