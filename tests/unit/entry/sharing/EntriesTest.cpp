// Which entry of a sharing check table is for a call.

#include <regex.h>

#include <vector>

#include "tests/unit/entry/sharing/Fixture.h"

namespace QELO {
namespace {

bool first(APIRequest*, APIResponse*) {
  return true;
}
bool second(APIRequest*, APIResponse*) {
  return false;
}

class LinkEntries : public Links {
 protected:
  using Entry = _tag_API_SHARING_CHECK_TABLE;
  using Check = bool (*)(APIRequest*, APIResponse*);

  /// The check that a table has for QELO.Test.Good 1 echo; null when none.
  Check Find(std::vector<Entry> table) {
    Describe("{}", kByLink);
    MakeRequest();
    table.push_back({nullptr, 0, nullptr, nullptr});
    Check check = nullptr;
    const bool found = entry->GetSharingCheckFunc(entry->Request(), table.data(), &check);
    EXPECT_EQ(found, check != nullptr);
    return check;
  }
};

TEST_F(LinkEntries, AnyApiVersionAndMethodMatchEveryCall) {
  EXPECT_EQ(Find({{"*", 0, "*", first}}), first);
}

TEST_F(LinkEntries, FirstThatMatchesWins) {
  EXPECT_EQ(Find({{"*", 0, "*", second}, {"*", 0, "*", first}}), second);
}

TEST_F(LinkEntries, NoneIsFound) {
  EXPECT_EQ(Find({}), nullptr);
  EXPECT_EQ(Find({{"Other", 0, "*", first}, {"*", 0, "other", first}}), nullptr);
}

TEST_F(LinkEntries, OfAnotherVersionIsSkipped) {
  EXPECT_EQ(Find({{"*", 2, "*", second}, {"*", 1, "*", first}}), first);
}

TEST_F(LinkEntries, NamesAreExtendedRegularExpressions) {
  EXPECT_EQ(Find({{"^QELO[.]Test[.](Bad|Good)$", 1, "^(echo)+$", first}}), first);
  EXPECT_EQ(Find({{"Test", 0, "ech", first}}), first);
  EXPECT_EQ(Find({{"^Test", 0, "*", first}}), nullptr);
  EXPECT_EQ(Find({{"*", 0, "^ECHO$", first}}), nullptr);
}

TEST_F(LinkEntries, BrokenExpressionMatchesNothing) {
  EXPECT_EQ(Find({{"(", 0, "*", second}, {"*", 0, "[", second}, {"*", 0, "*", first}}), first);
}

TEST_F(LinkEntries, EmptyApiIsSkippedWithAWarning) {
  EXPECT_EQ(Find({{"", 0, "*", second}, {"*", 0, "*", first}}), first);
  EXPECT_EQ(Logged(LOG_ERR, "warning: empty api regex in " + link.projectName), 1);
}

TEST_F(LinkEntries, EmptyOrMissingMethodIsSkippedWithAWarning) {
  EXPECT_EQ(Find({{"*", 0, "", second}, {"*", 0, nullptr, second}, {"*", 0, "*", first}}), first);
  EXPECT_EQ(Logged(LOG_ERR, "warning: empty method regex in " + link.projectName), 2);
}

TEST_F(LinkEntries, OfAnotherVersionOrApiWarnOfNothing) {
  EXPECT_EQ(Find({{"", 2, "*", second}, {"Other", 0, "", second}}), nullptr);
  EXPECT_EQ(SyslogCapture::Count("warning: empty"), 0);
}

TEST_F(LinkEntries, MissingArgumentsAreLogged) {
  MakeRequest();
  Entry table[] = {{"*", 0, "*", first}, {nullptr, 0, nullptr, nullptr}};
  Check check = nullptr;
  EXPECT_FALSE(entry->GetSharingCheckFunc(entry->Request(), nullptr, &check));
  EXPECT_FALSE(entry->GetSharingCheckFunc(entry->Request(), table, nullptr));
  EXPECT_FALSE(entry->GetSharingCheckFunc(nullptr, table, &check));
  EXPECT_EQ(Logged(LOG_ERR, "bad parameters"), 3);
  EXPECT_EQ(check, nullptr);
}

TEST(RegexMatch, StarMatchesAnything) {
  EXPECT_EQ(LinkEntry<WebEntry>::RegexMatch("*", ""), 0);
  EXPECT_EQ(LinkEntry<WebEntry>::RegexMatch("*", "anything"), 0);
}

TEST(RegexMatch, WholeNamesAreComparedAsTheHostWould) {
  const char* subjects[] = {"QELO.Files.Item",   "QELO.Files.Items",
                            "xQELO.Files.Item",  "QELO-Files_2",
                            "QELOxFiles.Item",   "",
                            "QELO.Files.Item\n", "[.]"};
  for (const char* pattern :
       {"^QELO[.]Files[.]Item$", "^QELO-Files_2$", "^$", "^[.]$", "^QELO.Files.Item$", "^[.$",
        "^$$", "^^$", "QELO[.]Files[.]Item$", "^QELO[.]Files[.]Item", "^a|b$", "^x*$", "^", "$"}) {
    regex_t expression;
    const int fault = regcomp(&expression, pattern, REG_EXTENDED);
    for (const char* subject : subjects) {
      const int hosts = fault != 0 ? fault : regexec(&expression, subject, 0, nullptr, 0);
      EXPECT_EQ(LinkEntry<WebEntry>::RegexMatch(pattern, subject), hosts)
          << pattern << " " << subject;
    }
    if (fault == 0) {
      regfree(&expression);
    }
  }
}

TEST(RegexMatch, AnswersTheHostsResult) {
  EXPECT_EQ(LinkEntry<WebEntry>::RegexMatch("^a+$", "aaa"), 0);
  EXPECT_EQ(LinkEntry<WebEntry>::RegexMatch("^a+$", "aab"), REG_NOMATCH);
  EXPECT_EQ(LinkEntry<WebEntry>::RegexMatch("(", "("), REG_EPAREN);
}

}  // namespace
}  // namespace QELO
