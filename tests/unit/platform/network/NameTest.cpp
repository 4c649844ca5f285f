#include <gtest/gtest.h>

#include <string>

#include "webapi/platform/Network.h"

namespace {

/// 63 characters.
const std::string kLabel(63, 'a');
/// The longest name: 253 characters.
const std::string kName = kLabel + "." + kLabel + "." + kLabel + "." + std::string(61, 'a');

constexpr const char* kBoth[] = {
    "nas",
    "NAS",
    "n",
    "nas-1",
    "3com.com",
    "1.example",
    "a-b.c-d",
    "4.2.example.com",
    "a1",
    "xn--bcher-kva.example",
    "XN--BCHER-KVA.example",
    "example.xn--p1ai",
    "r3---sn.example",
    "a--b",
    "1a",
    "0xg",
    "1.2.3.4a",
};

constexpr const char* kNeither[] = {
    "",
    ".",
    "..",
    ".nas",
    "nas..example",
    "-nas",
    "nas-",
    "nas-.example",
    "nas.-example",
    "a_b",
    "_ldap._tcp.example",
    "a b",
    " nas",
    "nas ",
    "nas\n",
    "nas/",
    "nas:80",
    "a@b",
    "*.example",
    "b\xC3\xBC"
    "cher.example",  // the name itself, not its ASCII form
    "1",
    "127.1",
    "10.0.0.1",
    "999.999.999.999",
    "example.1",
    "1.2.3.4.5",
    "0x7f",
    "0x7f.1",
    "0xbad",
    "::1",
    "[::1]",
    "fe80::1",
    "xn--",
    "xn---",
    "xn--a-",
    "xn---a",
    "xn--99999999",
    "%00",
    "nas;id",
};

}  // namespace

TEST(Hostname, IsLabelsOfLettersDigitsAndInnerHyphens) {
  for (const char* text : kBoth) {
    EXPECT_EQ(BlQLIBIsHostname(text), 1) << text;
  }
  for (const char* text : kNeither) {
    EXPECT_EQ(BlQLIBIsHostname(text), 0) << text;
  }
}

TEST(Domain, IsMadeAsAHostname) {
  for (const char* text : kBoth) {
    EXPECT_EQ(BlQLIBIsDomain(text), 1) << text;
  }
  for (const char* text : kNeither) {
    EXPECT_EQ(BlQLIBIsDomain(text), 0) << text;
  }
}

TEST(Domain, MayEndWithOneDotAndAHostnameMayNot) {
  EXPECT_EQ(BlQLIBIsDomain("example.com."), 1);
  EXPECT_EQ(BlQLIBIsDomain("com."), 1);
  EXPECT_EQ(BlQLIBIsDomain("example.com.."), 0);
  EXPECT_EQ(BlQLIBIsDomain("10.0.0.1."), 0);
  EXPECT_EQ(BlQLIBIsHostname("example.com."), 0);
}

TEST(Names, HoldLabelsOf63Characters) {
  EXPECT_EQ(BlQLIBIsHostname(kLabel.c_str()), 1);
  EXPECT_EQ(BlQLIBIsHostname((kLabel + "a").c_str()), 0);
  EXPECT_EQ(BlQLIBIsHostname(("x." + kLabel + "a.x").c_str()), 0);
}

TEST(Names, Hold253Characters) {
  ASSERT_EQ(kName.size(), 253U);
  EXPECT_EQ(BlQLIBIsHostname(kName.c_str()), 1);
  EXPECT_EQ(BlQLIBIsHostname((kName + "a").c_str()), 0);
  EXPECT_EQ(BlQLIBIsDomain(kName.c_str()), 1);
  EXPECT_EQ(BlQLIBIsDomain((kName + ".").c_str()), 1);
  EXPECT_EQ(BlQLIBIsDomain((kName + "a").c_str()), 0);
  EXPECT_EQ(BlQLIBIsDomain((kName + "a.").c_str()), 0);
  EXPECT_EQ(BlQLIBIsDomain((kName + "..").c_str()), 0);
}

TEST(Names, OfAnyLengthAreRefusedAtOnce) {
  const std::string longText(16UL << 20U, 'a');
  EXPECT_EQ(BlQLIBIsHostname(longText.c_str()), 0);
  EXPECT_EQ(BlQLIBIsDomain(longText.c_str()), 0);
}

TEST(Names, OfNothingAreNone) {
  EXPECT_EQ(BlQLIBIsHostname(nullptr), 0);
  EXPECT_EQ(BlQLIBIsDomain(nullptr), 0);
}
