#include <gtest/gtest.h>

#include <string>

#include "webapi/platform/Network.h"

namespace {

/// Asked by the name that Punycode is for.
bool isPunycode(const std::string& text) {
  return BlQLIBIsHostname(("xn--" + text).c_str()) != 0;
}

}  // namespace

TEST(Punycode, IsWhatNamesInManyScriptsBecome) {
  for (const char* text :
       {"bcher-kva", "mnchen-3ya", "p1ai", "fiqs8s", "wgbl6a", "80ak6aa92e", "3e0b707e",
        "egbpdaj6bu4bxfgehfvwxn", "ihqwcrb4cv8a8dqg056pqjye", "4dbcagdahymbxekheh6e0a7fei0b",
        "ls8h", "a-eha"}) {  // the last two: one character beyond 16 bits; "a" and an umlaut
    EXPECT_TRUE(isPunycode(text)) << text;
  }
}

TEST(Punycode, IsReadInAnyCase) {
  EXPECT_TRUE(isPunycode("BCHER-KVA"));
}

TEST(Punycode, HoldsACharacterBeyondAscii) {
  EXPECT_FALSE(isPunycode(""));
  EXPECT_FALSE(isPunycode("abc-"));
  EXPECT_FALSE(isPunycode("-"));
}

TEST(Punycode, EndsBehindAWholeNumber) {
  EXPECT_FALSE(isPunycode("bcher-kv"));
  EXPECT_FALSE(isPunycode("z"));
}

TEST(Punycode, HasDigitsAlone) {
  EXPECT_FALSE(isPunycode("bcher-k_a"));
  EXPECT_FALSE(isPunycode("-kva"));
  EXPECT_FALSE(
      isPunycode("k\xFF"
                 "a"));
}

TEST(Punycode, StaysWithinTheCharactersThereAre) {
  EXPECT_TRUE(isPunycode("dn32g"));  // the last one
  EXPECT_FALSE(isPunycode("en32g"));
  EXPECT_TRUE(isPunycode("hb9b"));   // the last before the surrogates
  EXPECT_FALSE(isPunycode("ib9b"));  // the first and the last of them
  EXPECT_FALSE(isPunycode("zy0c"));
  EXPECT_FALSE(isPunycode(std::string(58, '9') + "a"));
}
