#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "tests/support/FakePlatform.h"
#include "webapi/APIValidator.h"

using namespace QELO;

namespace {

using Check = bool (*)(const std::string&);

constexpr Check kTextChecks[] = {
    APIValidator::IsEMail,  APIValidator::IsNetbios,   APIValidator::IsWorkGroup,
    APIValidator::IsDigit,  APIValidator::IsTavlinkId, APIValidator::IsHostname,
    APIValidator::IsDomain, APIValidator::IsIP,        APIValidator::IsIPv4,
    APIValidator::IsIPv6,
};

void expect(Check check, bool expected, const std::vector<std::string>& texts) {
  for (const std::string& text : texts) {
    EXPECT_EQ(check(text), expected) << text;
  }
}

/// The characters that pass a check alone between two texts, control characters left out.
std::string passing(Check check, const std::string& before, const std::string& after) {
  std::string found;
  for (int c = 0x20; c < 0x100; ++c) {
    if (check(before + static_cast<char>(c) + after)) {
      found += static_cast<char>(c);
    }
  }
  return found;
}

constexpr char kDigits[] = "0123456789";
constexpr char kUpper[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZ";
constexpr char kLower[] = "abcdefghijklmnopqrstuvwxyz";

}  // namespace

TEST(TextChecks, RefuseAnEmptyTextWithoutAskingThePlatform) {
  FakePlatform::Reset().hostname = FakePlatform::Get().domain = 1;
  FakePlatform::Get().addressType = 2;
  for (const Check check : kTextChecks) {
    EXPECT_FALSE(check(""));
  }
  EXPECT_EQ(FakePlatform::Get().calls, std::vector<std::string>());
}

TEST(TextChecks, RefuseATextWithANul) {
  FakePlatform::Reset().hostname = FakePlatform::Get().domain = 1;
  for (const int type : {2, 10}) {
    FakePlatform::Get().addressType = type;
    for (const Check check : kTextChecks) {
      EXPECT_FALSE(check(std::string("1\0", 2)));
      EXPECT_FALSE(check(std::string("\0", 1)));
      EXPECT_FALSE(check(std::string("a@b\0c", 5)));
    }
  }
  EXPECT_EQ(FakePlatform::Get().calls, std::vector<std::string>());
}

TEST(TextChecks, AreFoundThroughTheInstanceToo) {
  EXPECT_TRUE(APIValidator::GetInstance()->IsDigit("1"));
  EXPECT_TRUE(APIValidator::GetInstance()->IsPort(1));
}

TEST(EMailCheck, WantsCharactersOnBothSidesOfTheSign) {
  expect(APIValidator::IsEMail, true,
         {"a@b", "ann.b@example.com", "ann+x@example.com", "a@b@c", "\"a,b\"@c", "@@b"});
  expect(APIValidator::IsEMail, false, {"a", "@", "a@", "@b", "a b@c", "a@b c", "a@b\n", " a@b"});
}

TEST(EMailCheck, TakesTheCharactersOfItsTwoSetsAndNoOthers) {
  // From "+" to the backslash is one range in each set.
  const std::string range = std::string("+,-./") + kDigits + ":;<=>?@" + kUpper + "[\\";
  EXPECT_EQ(passing(APIValidator::IsEMail, "", "@x"),
            "!\"#$%&'()*" + range + "^_`" + kLower + "{|}~");
  EXPECT_EQ(passing(APIValidator::IsEMail, "x@", ""), "!#%&" + range + "_" + kLower);
}

TEST(NetbiosCheck, WantsALetterFirst) {
  EXPECT_EQ(passing(APIValidator::IsNetbios, "", "x"), std::string(kUpper) + kLower);
  EXPECT_EQ(passing(APIValidator::IsNetbios, "x", ""),
            std::string("-") + kDigits + kUpper + "_" + kLower);
}

TEST(NetbiosCheck, TakesUpTo255Characters) {
  EXPECT_TRUE(APIValidator::IsNetbios("a"));
  EXPECT_TRUE(APIValidator::IsNetbios(std::string(255, 'a')));
  EXPECT_FALSE(APIValidator::IsNetbios(std::string(256, 'a')));
  EXPECT_FALSE(APIValidator::IsNetbios("1" + std::string(254, 'a')));
}

TEST(WorkGroupCheck, WantsOneCharacterOutsideOfItsSet) {
  const std::string inside = "\"*+,/:;<>?[\\]|";
  std::string outside;
  for (int c = 0x20; c < 0x7F; ++c) {
    if (inside.find(static_cast<char>(c)) == std::string::npos) {
      outside += static_cast<char>(c);
    }
  }
  EXPECT_EQ(passing(APIValidator::IsWorkGroup, "", "").substr(0, outside.size()), outside);
  for (const char c : inside) {
    EXPECT_FALSE(APIValidator::IsWorkGroup(std::string(1, c))) << c;
  }
  EXPECT_FALSE(APIValidator::IsWorkGroup(inside));
}

TEST(WorkGroupCheck, PassesAsSoonAsOneCharacterDoes) {
  expect(APIValidator::IsWorkGroup, true, {"a*", "*a", "***a***", " ", "WORKGROUP", "\n"});
  expect(APIValidator::IsWorkGroup, false, {"*", "***", "*?"});
}

TEST(DigitCheck, TakesDigitsAlone) {
  expect(APIValidator::IsDigit, true, {"0", "007", std::string(100000, '9')});
  expect(APIValidator::IsDigit, false, {"-1", "+1", "1.0", "1 ", "1\n", "\n1", "0x1", "\xD9\xA1"});
  EXPECT_EQ(passing(APIValidator::IsDigit, "", ""), kDigits);
}

TEST(TavlinkIdCheck, TakesLettersDigitsAndHyphens) {
  expect(APIValidator::IsTavlinkId, true, {"a", "-", "A-1", "9"});
  expect(APIValidator::IsTavlinkId, false, {"a_b", "a b", "a\n", "a."});
  EXPECT_EQ(passing(APIValidator::IsTavlinkId, "", ""),
            std::string("-") + kDigits + kUpper + kLower);
}

TEST(NameChecks, AskThePlatform) {
  FakePlatform& platform = FakePlatform::Reset();
  EXPECT_FALSE(APIValidator::IsHostname("nas"));
  EXPECT_FALSE(APIValidator::IsDomain("example"));
  for (const int yes : {1, -1, 7}) {
    platform.hostname = yes;
    EXPECT_TRUE(APIValidator::IsHostname("nas"));
    EXPECT_FALSE(APIValidator::IsDomain("example"));
    platform.hostname = 0;
    platform.domain = yes;
    EXPECT_TRUE(APIValidator::IsDomain("example"));
    EXPECT_FALSE(APIValidator::IsHostname("nas"));
    platform.domain = 0;
  }
  EXPECT_EQ(platform.calls[0], "BlQLIBIsHostname(nas)");
  EXPECT_EQ(platform.calls[1], "BlQLIBIsDomain(example)");
}

TEST(AddressChecks, GoByThePlatformsKindOfAddress) {
  FakePlatform& platform = FakePlatform::Reset();
  struct {
    int type;
    bool ip, v4, v6;
  } const kinds[] = {{0, false, false, false},
                     {2, true, true, false},
                     {10, true, false, true},
                     {1, true, false, false},
                     {-1, true, false, false}};
  for (const auto& kind : kinds) {
    platform.addressType = kind.type;
    EXPECT_EQ(APIValidator::IsIP("x"), kind.ip) << kind.type;
    EXPECT_EQ(APIValidator::IsIPv4("x"), kind.v4) << kind.type;
    EXPECT_EQ(APIValidator::IsIPv6("x"), kind.v6) << kind.type;
  }
  EXPECT_EQ(platform.calls[0], "QELONetGetAddrType(x)");
}

TEST(PortCheck, TakesSixteenBits) {
  for (const int port : {0, 1, 80, 65535}) {
    EXPECT_TRUE(APIValidator::IsPort(port)) << port;
  }
  for (const int port : {-1, 65536, 65537, 2147483647, -2147483647 - 1}) {
    EXPECT_FALSE(APIValidator::IsPort(port)) << port;
  }
}
