#include <gtest/gtest.h>
#include <syslog.h>

#include <map>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/model/FailingLibc.h"
#include "webapi/APIValidator.h"
#include "webapi/model/validator/APIValidatorPrivate.h"

using namespace QELO;

TEST(CheckRegex, MatchesSomewhereInTheValue) {
  EXPECT_TRUE(APIValidator::CheckRegex("xaby", "ab"));
  EXPECT_FALSE(APIValidator::CheckRegex("xay", "ab"));
  EXPECT_FALSE(APIValidator::CheckRegex("XABY", "ab"));
}

TEST(CheckRegex, ReadsExtendedSyntax) {
  EXPECT_TRUE(APIValidator::CheckRegex("aab", "^(a+|c)b{1}$"));
  EXPECT_FALSE(APIValidator::CheckRegex("(a+)", "^(a+)$"));
}

TEST(CheckRegex, TakesLineEndsAsCharacters) {
  EXPECT_FALSE(APIValidator::CheckRegex("a\nb", "^a$"));
  EXPECT_TRUE(APIValidator::CheckRegex("a\nb", "^a.b$"));
}

TEST(CheckRegex, MayPassAnEmptyValue) {
  EXPECT_TRUE(APIValidator::CheckRegex("", "^$"));
}

TEST(CheckRegex, RefusesAValueWithANul) {
  EXPECT_FALSE(APIValidator::CheckRegex(std::string("a\0b", 3), "^a$"));
  EXPECT_FALSE(APIValidator::CheckRegex(std::string("a\0b", 3), "a"));
}

TEST(CheckRegex, RefusesWithoutAPattern) {
  EXPECT_FALSE(APIValidator::CheckRegex("a", nullptr));
}

TEST(CheckRegex, LogsAPatternThatCannotBeCompiledEachTime) {
  SyslogCapture::Clear();
  EXPECT_FALSE(APIValidator::CheckRegex("a", "(a"));
  EXPECT_FALSE(APIValidator::CheckRegex("a", "(a"));
  ASSERT_EQ(SyslogCapture::Messages().size(), 2U);
  EXPECT_EQ(SyslogCapture::Messages()[0].text, "APIValidator:57 Invalid pattern");
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_ERR);
}

TEST(RegexCache, CompilesAPatternOnce) {
  const FailingLibc libc;
  APIValidatorPrivate cache;
  static const char pattern[] = "^a$";
  const regex_t* first = nullptr;
  const regex_t* second = nullptr;
  EXPECT_TRUE(cache.GetRegex(pattern, first));
  EXPECT_TRUE(cache.GetRegex(pattern, second));
  EXPECT_NE(first, nullptr);
  EXPECT_EQ(first, second);
  EXPECT_EQ(libc.compiled, 1);
}

TEST(RegexCache, KnowsAPatternByItsAddress) {
  const FailingLibc libc;
  APIValidatorPrivate cache;
  static const char one[] = "^a$";
  static const char other[] = "^a$";
  const regex_t* first = nullptr;
  const regex_t* second = nullptr;
  EXPECT_TRUE(cache.GetRegex(one, first));
  EXPECT_TRUE(cache.GetRegex(other, second));
  EXPECT_NE(first, second);
  EXPECT_EQ(libc.compiled, 2);
}

TEST(RegexCache, KeepsNothingOfAPatternThatCannotBeCompiled) {
  SyslogCapture::Clear();
  FailingLibc libc;
  APIValidatorPrivate cache;
  static const char pattern[] = "^a$";
  const regex_t* compiled = nullptr;
  libc.regcompFails = true;
  EXPECT_FALSE(cache.GetRegex(pattern, compiled));
  EXPECT_EQ(compiled, nullptr);
  EXPECT_EQ(SyslogCapture::Count("APIValidator:57 Invalid pattern"), 1);
  libc.regcompFails = false;
  EXPECT_TRUE(cache.GetRegex(pattern, compiled));
  EXPECT_NE(compiled, nullptr);
}

TEST(CheckRegex, RefusesAValueThatThereIsNoMemoryToMatch) {
  FailingLibc libc;
  EXPECT_TRUE(APIValidator::CheckRegex("ab", "^ab$"));
  libc.regexecFails = true;
  EXPECT_FALSE(APIValidator::CheckRegex("ab", "^ab$"));
  EXPECT_FALSE(APIValidator::IsEMail("ann@example.com"));
}

TEST(RegexCache, ReleasesItsExpressions) {
  const FailingLibc libc;
  {
    APIValidatorPrivate cache;
    const regex_t* compiled = nullptr;
    EXPECT_TRUE(cache.GetRegex("a", compiled));
    EXPECT_TRUE(cache.GetRegex("b", compiled));
    EXPECT_EQ(libc.freed, 0);
  }
  EXPECT_EQ(libc.freed, 2);
}

TEST(ValidatorInstance, IsOne) {
  EXPECT_NE(APIValidator::GetInstance(), nullptr);
  EXPECT_EQ(APIValidator::GetInstance(), APIValidator::GetInstance());
}

TEST(ValidatorInstanceDeathTest, IsOneForThreadsThatAskFirstTogether) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");  // a process that has not asked yet
  const auto askTogether = [] {
    std::vector<APIValidator*> found(16);
    std::vector<std::thread> threads;
    threads.reserve(found.size());
    for (APIValidator*& each : found) {
      threads.emplace_back([&each] { each = APIValidator::GetInstance(); });
    }
    for (std::thread& thread : threads) {
      thread.join();
    }
    const bool same = std::vector<APIValidator*>(found.size(), found[0]) == found;
    _exit(same && found[0] != nullptr ? 0 : 1);
  };
  EXPECT_EXIT(askTogether(), testing::ExitedWithCode(0), "");
}
