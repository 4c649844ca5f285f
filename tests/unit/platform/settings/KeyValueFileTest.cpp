#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"

namespace {

class KeyValue : public PrivateRoot {
 protected:
  static int Check(const char* key, const char* value, int ignoreCase = 0) {
    return QLIBCFileCheckKeyValue(Path("etc/test.conf").c_str(), key, value, ignoreCase);
  }
};

TEST_F(KeyValue, QuotesMayBeLeftOut) {
  Write("etc/test.conf", "a=\"one two\"\nb=one two\nc='x y'\nd=\nlast=end");
  EXPECT_EQ(Check("a", "one two"), 1);
  EXPECT_EQ(Check("b", "one two"), 1);
  EXPECT_EQ(Check("c", "x y"), 1);
  EXPECT_EQ(Check("d", ""), 1);
  EXPECT_EQ(Check("last", "end"), 1);
}

TEST_F(KeyValue, BlanksAroundKeyAndValueGo) {
  Write("etc/test.conf", " a = yes \r\n\tb\t=\t\" yes \"\t\n");
  EXPECT_EQ(Check("a", "yes"), 1);
  EXPECT_EQ(Check("b", " yes "), 1);
}

TEST_F(KeyValue, CommentsAreNoLines) {
  Write("etc/test.conf", "#a=yes\n  # b=yes\nc=yes # on\nd=\"a # b\" # on\ne=a#b\nf=# nothing\n");
  EXPECT_EQ(Check("a", "yes"), 0);
  EXPECT_EQ(Check("b", "yes"), 0);
  EXPECT_EQ(Check("c", "yes"), 1);
  EXPECT_EQ(Check("d", "a # b"), 1);
  EXPECT_EQ(Check("e", "a#b"), 1);
  EXPECT_EQ(Check("f", ""), 1);
}

TEST_F(KeyValue, LastOfTwoLinesCounts) {
  Write("etc/test.conf", "a=no\na=yes\n");
  EXPECT_EQ(Check("a", "yes"), 1);
  EXPECT_EQ(Check("a", "no"), 0);
}

TEST_F(KeyValue, KeyIsTakenAsAWhole) {
  Write("etc/test.conf", "enable=yes\nno equals\n");
  EXPECT_EQ(Check("enable_x", "yes"), 0);
  EXPECT_EQ(Check("enabl", "yes"), 0);
  EXPECT_EQ(Check("Enable", "yes", 1), 0);
  EXPECT_EQ(Check("no equals", ""), 0);
}

TEST_F(KeyValue, CaseOfTheValueIsIgnoredOnlyWhenAsked) {
  Write("etc/test.conf", "a=Yes\n");
  EXPECT_EQ(Check("a", "yes"), 0);
  EXPECT_EQ(Check("a", "yes", 1), 1);
  EXPECT_EQ(Check("a", "ye", 1), 0);
}

TEST_F(KeyValue, OpenQuoteEndsWithTheLine) {
  Write("etc/test.conf", "a=\"yes\nb=no\n");
  EXPECT_EQ(Check("a", "yes"), 1);
  EXPECT_EQ(Check("b", "no"), 1);
}

TEST_F(KeyValue, MissingFileDirectoryAndHugeFileHaveNoKeys) {
  EXPECT_EQ(Check("a", ""), 0);
  EXPECT_EQ(QLIBCFileCheckKeyValue(Path("etc").c_str(), "a", "", 0), 0);
  Write("etc/test.conf", "a=yes\n" + std::string(1 << 20, '#'));
  EXPECT_EQ(Check("a", "yes"), 0);
}

using SettingsFiles = PrivateRoot;

TEST_F(SettingsFiles, TimeoutIs900SecondsWhenNotSet) {
  Set({});
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 900);
}

TEST_F(SettingsFiles, TimeoutIsTheSetting) {
  Set({{"session_timeout", "60"}});
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 60);
}

TEST_F(SettingsFiles, TimeoutThatIsNoNumberOfSecondsIsNotTaken) {
  for (const char* wrong : {"0", "-1", "ten", "60s", "", "99999999999", "1.5"}) {
    Set({{"session_timeout", wrong}});
    EXPECT_EQ(QLIBCConfGetARDOTimeout(), 900) << wrong;
  }
}

TEST_F(SettingsFiles, DefaultsCountForKeysThatTheFirstFileLacks) {
  Write("etc.defaults/qeloinfo.conf", "session_timeout=70\nlanguage=ger\n");
  Set({{"session_timeout", "60"}});
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 60);
  EXPECT_STREQ(QeloCgiGetLang(nullptr), "ger");
  Set({});
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 70);
}

TEST_F(SettingsFiles, WithoutAnyFileTheDefaultsHold) {
  ASSERT_EQ(remove(Path("etc/qeloinfo.conf").c_str()), 0);
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 900);
  EXPECT_STREQ(QeloCgiGetLang(nullptr), "enu");
  EXPECT_EQ(QeloCgiIsTokenEnable(nullptr), 1);
}

}  // namespace
