#include "platform/schema/module/Pattern.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>

namespace QELO::Platform {
namespace {

constexpr size_t kEnough = 10'000'000;

bool Matches(const std::string& expression, const std::string& text) {
  Pattern pattern;
  std::string reason;
  EXPECT_TRUE(Pattern::Read(expression, pattern, reason)) << expression << ": " << reason;
  size_t work = kEnough;
  return pattern.IsIn(text, work);
}

std::string Reason(const std::string& expression) {
  Pattern pattern;
  std::string reason;
  EXPECT_FALSE(Pattern::Read(expression, pattern, reason)) << expression;
  return reason;
}

struct Case {
  const char* expression;
  const char* matching;
  const char* other;
};

TEST(Pattern, MatchesWhatTheExpressionSays) {
  for (const Case& each : {
           Case{"b", "abc", "acd"},
           Case{"^b", "bcd", "abc"},
           Case{"b$", "ab", "abc"},
           Case{"^a.c$", "abc", "a\nc"},
           Case{"^(cat|dog|)s$", "dogs", "cows"},
           Case{"^(?:ab)+$", "abab", "aba"},
           Case{"^a{2,3}$", "aaa", "aaaa"},
           Case{"^a{2}$", "aa", "aaa"},
           Case{"^a{2,}$", "aaaaa", "a"},
           Case{"^a{0}b$", "b", "ab"},
           Case{"^a*?b+?$", "aabb", "aa"},
           Case{"^[a-f0-9]+$", "c0ffee", "coffee"},
           Case{"^[^a-c]$", "d", "b"},
           Case{"^[\\w.-]+@[\\d]+$", "a_b.c-d@12", "a b@12"},
           Case{"^[\\]]$", "]", "["},
           Case{"^\\D\\S\\W$", "ab!", "1b!"},
           Case{"\\bcat\\b", "a cat!", "concatenate"},
           Case{"\\Bcat", "concat", "cat"},
           Case{"^\\u00e4$", "\xC3\xA4", "a"},
           Case{"^\\x41\\t\\.$", "A\t.", "A\tx"},
           Case{"^.$", "\xE2\x82\xAC", "ab"},
           Case{"^[\xC3\xA4-\xC3\xBC]$", "\xC3\xB6", "o"},
           Case{"^(a|(b|c)*)d$", "bcbcd", "bcbca"},
           Case{"^(a?){3}$", "aa", "aaaa"},
           Case{"^(a*)*$", "aaaa", "ab"},
           Case{"^$", "", "a"},
           Case{"^[-a]+[b-]$", "-a-", "-ac"},
       }) {
    EXPECT_TRUE(Matches(each.expression, each.matching)) << each.expression;
    EXPECT_FALSE(Matches(each.expression, each.other)) << each.expression;
  }
}

TEST(Pattern, SeesTextBehindANulAndBytesThatAreNoUtf8) {
  EXPECT_FALSE(Matches("^[a-z]*$", std::string("ab\0cd", 5)));
  EXPECT_TRUE(Matches("^ab\\0cd$", std::string("ab\0cd", 5)));
  EXPECT_TRUE(Matches("^a.b$",
                      "a\xFF"
                      "b"));
  EXPECT_FALSE(Matches("^[\\u0000-\\uffff]*$", "\xFF"));
}

TEST(Pattern, SaysWhyAnExpressionIsNone) {
  EXPECT_EQ(Reason("(a"), "a \"(\" without a \")\"");
  EXPECT_EQ(Reason("a)"), "a \")\" without a \"(\"");
  EXPECT_EQ(Reason("[a"), "the expression breaks off");
  EXPECT_EQ(Reason("a\\"), "nothing behind a backslash");
  EXPECT_EQ(Reason("*a"), "nothing to repeat");
  EXPECT_EQ(Reason("^*"), "nothing to repeat");
  EXPECT_EQ(Reason("a{2,1}"), "a number of repetitions that is none, or above 1000");
  EXPECT_EQ(Reason("a{1001}"), "a number of repetitions that is none, or above 1000");
  EXPECT_EQ(Reason("a{99999999999}"), "a number of repetitions that is none, or above 1000");
  EXPECT_EQ(Reason("a{x}"), "no number of repetitions");
  EXPECT_EQ(Reason("(?=a)"), "looking around and names of groups are not supported");
  EXPECT_EQ(Reason("(a)\\1"), "an escape that is not supported");
  EXPECT_EQ(Reason("\\u12g4"), "no hexadecimal digits where they must be");
  EXPECT_EQ(Reason("[z-a]"), "a range that is none");
  EXPECT_EQ(Reason("[\\d-z]"), "a range that is none");
  EXPECT_EQ(Reason("(((a{100}){100}){100})"), "the expression repeats too much");
  EXPECT_EQ(Reason("(a{0,1000}){0,1000}"), "the expression repeats too much");
  EXPECT_EQ(Reason(std::string(1025, 'a')), "the expression is too long");
  EXPECT_EQ(Reason(std::string(40, '(') + std::string(40, ')')), "groups within too many groups");
}

TEST(Pattern, NoExpressionMakesATextCostMoreThanItsLength) {
  const std::string text = std::string(20'000, 'a') + "!";
  const auto begin = std::chrono::steady_clock::now();
  for (const char* expression : {"^(a+)+$", "^(a|a)*$", "^(a|aa)+$", "(.*)*x", "^a*a*a*a*b$",
                                 "(([a-z])+.)+[A-Z]([a-z])+$"}) {
    EXPECT_FALSE(Matches(expression, text)) << expression;
  }
  EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(20));
}

TEST(Pattern, WorkIsBounded) {
  Pattern pattern;
  std::string reason;
  ASSERT_TRUE(Pattern::Read("(x+x+)+y", pattern, reason));
  size_t work = 1000;
  EXPECT_FALSE(pattern.IsIn(std::string(10'000, 'x') + "y", work));
  EXPECT_EQ(work, 0U);
}

}  // namespace
}  // namespace QELO::Platform
