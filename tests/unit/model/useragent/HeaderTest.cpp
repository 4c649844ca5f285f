#include <gtest/gtest.h>

#include <string>

#include "tests/unit/model/useragent/Fixture.h"

namespace {

struct Header {
  const char* device;
  const char* text;
  const char* expected;
};

constexpr char kIPhone[] = "Mobile MobileDevice IPhone WebKit SupportWebApp";
constexpr char kIPad[] = "Mobile MobileDevice IPhone IPad WebKit SupportWebApp";
constexpr char kAndroid[] = "Mobile MobileDevice Android WebKit SupportWebApp";
constexpr char kPlain[] = "Mobile MobileDevice";

/// What devices really send.
constexpr Header kHeaders[] = {
    {"iPhone",
     "Mozilla/5.0 (iPhone; CPU iPhone OS 17_4_1 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like "
     "Gecko) Version/17.4.1 Mobile/15E148 Safari/604.1",
     kIPhone},
    {"iPhone, the first one",
     "Mozilla/5.0 (iPhone; U; CPU like Mac OS X; en) AppleWebKit/420+ (KHTML, like Gecko) "
     "Version/3.0 Mobile/1A543a Safari/419.3",
     kIPhone},
    {"iPhone, Opera Mini",
     "Opera/9.80 (iPhone; Opera Mini/7.0.4/28.2555; U; fr) Presto/2.8.119 Version/11.10",
     "Mobile MobileDevice IPhone"},
    {"iPod",
     "Mozilla/5.0 (iPod touch; CPU iPhone OS 12_5_5 like Mac OS X) AppleWebKit/605.1.15 (KHTML, "
     "like Gecko) Version/12.1.2 Mobile/15E148 Safari/604.1",
     kIPhone},
    {"iPad",
     "Mozilla/5.0 (iPad; CPU OS 12_5_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) "
     "Version/12.1.2 Mobile/15E148 Safari/604.1",
     kIPad},
    {"iPad, Opera Mini",
     "Opera/9.80 (iPad; Opera Mini/7.0.5/191.283; U; es) Presto/2.12.423 Version/12.16",
     "Mobile MobileDevice IPhone IPad"},
    {"iPad that asks for desktop pages",
     "Mozilla/5.0 (Macintosh; Intel Mac OS X 10_15_7) AppleWebKit/605.1.15 (KHTML, like Gecko) "
     "Version/17.4.1 Safari/605.1.15",
     "WebKit"},
    {"Android phone",
     "Mozilla/5.0 (Linux; Android 14; Pixel 8) AppleWebKit/537.36 (KHTML, like Gecko) "
     "Chrome/124.0.0.0 Mobile Safari/537.36",
     kAndroid},
    {"Android tablet",
     "Mozilla/5.0 (Linux; Android 12; SM-X906C Build/QP1A.190711.020) AppleWebKit/537.36 (KHTML, "
     "like Gecko) Chrome/80.0.3987.119 Safari/537.36",
     kAndroid},
    {"Android, Firefox", "Mozilla/5.0 (Android 14; Mobile; rv:125.0) Gecko/125.0 Firefox/125.0",
     "Mobile MobileDevice Android"},
    {"Android, Opera Mini",
     "Opera/9.80 (Android; Opera Mini/36.2.2254/191.283; U; en) Presto/2.12.423 Version/12.16",
     "Mobile MobileDevice Android"},
    {"PlayBook",
     "Mozilla/5.0 (PlayBook; U; RIM Tablet OS 2.1.0; en-US) AppleWebKit/536.2+ (KHTML, like "
     "Gecko) Version/7.2.1.0 Safari/536.2+",
     "Mobile MobileDevice PlayBook WebKit SupportWebApp"},
    {"BlackBerry 6",
     "Mozilla/5.0 (BlackBerry; U; BlackBerry 9800; en) AppleWebKit/534.1+ (KHTML, like Gecko) "
     "Version/6.0.0.337 Mobile Safari/534.1+",
     "Mobile MobileDevice BlackBerry6 WebKit SupportWebApp"},
    {"BlackBerry 4.2", "BlackBerry8100/4.2.0 Profile/MIDP-2.0 Configuration/CLDC-1.1 VendorID/100",
     kPlain},
    {"BlackBerry 10, which names itself BB10",
     "Mozilla/5.0 (BB10; Touch) AppleWebKit/537.10+ (KHTML, like Gecko) Version/10.0.9.2372 Mobile "
     "Safari/537.10+",
     "WebKit"},
    {"Windows CE", "Mozilla/4.0 (compatible; MSIE 6.0; Windows CE; IEMobile 8.12; MSIEMobile 6.0)",
     "Mobile MobileDevice IEMobile"},
    {"Windows Phone 8.1",
     "Mozilla/5.0 (Mobile; Windows Phone 8.1; Android 4.0; ARM; Trident/7.0; Touch; rv:11.0; "
     "IEMobile/11.0; NOKIA; Lumia 520) like iPhone OS 7_0_3 Mac OS X AppleWebKit/537 (KHTML, like "
     "Gecko) Mobile Safari/537",
     "Mobile MobileDevice IPhone IEMobile WebKit SupportWebApp"},
    {"Windows Phone 7.5, which names no device that is known",
     "Mozilla/5.0 (compatible; MSIE 9.0; Windows Phone OS 7.5; Trident/5.0; IEMobile/9.0; NOKIA; "
     "Lumia 710)",
     ""},
    {"Opera Mini on a Java phone",
     "Opera/9.80 (J2ME/MIDP; Opera Mini/7.1.32052/29.3709; U; en) Presto/2.8.119 Version/11.10",
     kPlain},
    {"Opera Mobile on Symbian",
     "Opera/9.80 (S60; SymbOS; Opera Mobi/499; U; en-GB) Presto/2.4.18 Version/10.00", kPlain},
    {"Symbian",
     "Mozilla/5.0 (SymbianOS/9.4; Series60/5.0 Nokia5800d-1/60.0.003; Profile/MIDP-2.1 "
     "Configuration/CLDC-1.1) AppleWebKit/533.4 (KHTML, like Gecko) NokiaBrowser/7.3.1.33 Mobile "
     "Safari/533.4",
     "Mobile MobileDevice WebKit"},
    {"Palm", "Mozilla/4.76 (compatible; MSIE 6.0; U; Windows 95; PalmSource; PalmOS; WebPro/3.0)",
     "Mobile MobileDevice IEMobile"},
    {"Openwave",
     "SonyEricssonK700i/R2AE SEMC-Browser/4.0.3 Profile/MIDP-2.0 UP.Browser/7.0.2.3.119 (GUI)",
     kPlain},
    {"Chrome",
     "Mozilla/5.0 (Windows NT 10.0; Win64; x64) AppleWebKit/537.36 (KHTML, like Gecko) "
     "Chrome/124.0.0.0 Safari/537.36",
     "WebKit"},
    {"Edge",
     "Mozilla/5.0 (Windows NT 10.0; Win64; x64) AppleWebKit/537.36 (KHTML, like Gecko) "
     "Chrome/124.0.0.0 Safari/537.36 Edg/124.0.2478.67",
     "WebKit"},
    {"Firefox", "Mozilla/5.0 (X11; Linux x86_64; rv:125.0) Gecko/20100101 Firefox/125.0", ""},
    {"Safari",
     "Mozilla/5.0 (Macintosh; Intel Mac OS X 10_15_7) AppleWebKit/605.1.15 (KHTML, like Gecko) "
     "Version/17.4 Safari/605.1.15",
     "WebKit"},
    {"Internet Explorer 8", "Mozilla/4.0 (compatible; MSIE 8.0; Windows NT 6.1; Trident/4.0)", ""},
    {"Internet Explorer 11", "Mozilla/5.0 (Windows NT 6.3; Trident/7.0; rv:11.0) like Gecko", ""},
    {"curl", "curl/7.88.1", ""},
    {"nothing but the header", "", ""},
};

}  // namespace

TEST(UserAgentHeaders, AreClassifiedAsWhatDevicesSend) {
  for (const Header& header : kHeaders) {
    EXPECT_EQ(devices(header.text), header.expected) << header.device;
  }
}

TEST(UserAgentHeaders, NameADeviceInAnyCase) {
  EXPECT_EQ(devices("IPHONE APPLEWEBKIT"), kIPhone);
  EXPECT_EQ(devices("ipad webkit"), kIPad);
  for (const char* text : {"Opera Mini", "OPERA MINI/7", "opera mini", "xOpErA mInIx"}) {
    EXPECT_EQ(devices(text), kPlain) << text;
  }
}

TEST(UserAgentHeaders, OfAnyLengthAreReadToTheirEnd) {
  constexpr size_t kLong = 128UL * 1024;  // the longest that an environment can hold
  EXPECT_EQ(devices(std::string(kLong, 'o') + " iPhone AppleWebKit"), kIPhone);
  EXPECT_EQ(devices(std::string(kLong, 'o') + "UP.Browser"), kPlain);
  EXPECT_EQ(devices(std::string(kLong, 'o')), "");
}

TEST(UserAgentHeaders, OfBytesThatAreNoTextNameNothing) {
  EXPECT_EQ(devices("\xFF\xFE\x01\r\n%s%n"), "");
  EXPECT_EQ(devices("\xC3\x28 Opera Mini \xFF"), kPlain);
}

TEST(UserAgentHeaders, EndAtANul) {
  EXPECT_EQ(devices(std::string("curl\0iPhone AppleWebKit Opera Mini", 34)), "");
  EXPECT_EQ(devices(std::string("iPhone\0AppleWebKit", 18)), "Mobile MobileDevice IPhone");
}
