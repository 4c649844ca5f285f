#include <cstring>

#include "tests/unit/platform/login/SessionFixture.h"
#include "webapi/platform/Cgi.h"

namespace {

class CgiContext : public SessionFixture {
 protected:
  static QeloCgiContext Load(const std::string& cookies) {
    QeloCgiContext context{};
    setenv("HTTP_COOKIE", cookies.c_str(), 1);
    EXPECT_EQ(QeloCgiLoadInCookies(&context), 1);
    return context;
  }

  static std::string LanguageOf(const std::string& cookies) {
    QeloCgiContext context = Load(cookies);
    return QeloCgiGetLang(&context);
  }

  /// Result of the session check for this cookie line, without anti-forgery token.
  static int Check(const std::string& cookies) {
    QeloCgiContext context = Load(cookies);
    const QeloCgiAuthFlags fromParameter{1, 0};
    char user[64];
    return QeloCgiIsAuthorizedEx(&context, &fromParameter, user, sizeof user, 0, 1);
  }
};

TEST_F(CgiContext, InitLeavesTheFirstWordAndClearsTheRest) {
  QeloCgiContext context;
  memset(context.block, 0xAB, sizeof context.block);
  EXPECT_EQ(QeloCgiInit("", &context), 1);
  for (size_t i = 0; i < sizeof context.block; ++i) {
    EXPECT_EQ(context.block[i], i < sizeof(void*) ? 0xAB : 0) << i;
  }
}

TEST_F(CgiContext, InitWithoutContextFails) {
  EXPECT_EQ(QeloCgiInit("", nullptr), 0);
  EXPECT_EQ(QeloCgiInitEx("", nullptr), 0);
  EXPECT_EQ(QeloCgiLoadInCookies(nullptr), 0);
}

TEST_F(CgiContext, InitOfTheSessionStoreTakesTheCookies) {
  const Ticket ticket = Create();
  setenv("HTTP_COOKIE", ("id=" + ticket.id).c_str(), 1);
  QeloCgiContext context{};
  EXPECT_EQ(QeloCgiInitEx("current.users", &context), 1);
  const QeloCgiAuthFlags fromParameter{1, 0};
  char user[64];
  EXPECT_EQ(QeloCgiIsAuthorizedEx(&context, &fromParameter, user, sizeof user, 0, 1), 1);
  EXPECT_STREQ(user, "alice");
}

TEST_F(CgiContext, InitOfAnotherUserStoreFails) {
  QeloCgiContext context{};
  EXPECT_EQ(QeloCgiInitEx("other.users", &context), 0);
  EXPECT_EQ(QeloCgiInitEx(nullptr, &context), 0);
}

TEST_F(CgiContext, CookieIdIsFoundAnywhereInTheLine) {
  const std::string id = Create().id;
  EXPECT_EQ(Check("id=" + id), 1);
  EXPECT_EQ(Check("lang=ger; id=" + id + "; x=y"), 1);
  EXPECT_EQ(Check(" ;;id=" + id + "\t;"), 1);
  EXPECT_EQ(Check("lang=ger;id=" + id), 1);
}

TEST_F(CgiContext, NamesThatOnlyEndInIdDoNotCount) {
  const std::string id = Create().id;
  EXPECT_EQ(Check("sid=" + id), -2);
  EXPECT_EQ(Check("ID=" + id), -2);
  EXPECT_EQ(Check("abandoned=" + id), -2);
  EXPECT_EQ(Check("id"), -2);
  EXPECT_EQ(Check(""), -2);
}

TEST_F(CgiContext, LastOfTwoIdsCounts) {
  const std::string id = Create().id;
  EXPECT_EQ(Check("id=nonsense; id=" + id), 1);
  EXPECT_EQ(Check("id=" + id + "; id=nonsense"), -4);
  EXPECT_EQ(Check("id=" + id + "; id="), -2);
}

TEST_F(CgiContext, WithoutCookieVariableThereIsNoId) {
  unsetenv("HTTP_COOKIE");
  QeloCgiContext context{};
  EXPECT_EQ(QeloCgiLoadInCookies(&context), 1);
  const QeloCgiAuthFlags flags{1, 0};
  char user[8];
  EXPECT_EQ(QeloCgiIsAuthorizedEx(&context, &flags, user, sizeof user, 0, 0), -2);
}

TEST_F(CgiContext, LoadingAgainForgetsTheOldId) {
  const std::string id = Create().id;
  QeloCgiContext context = Load("id=" + id + "; lang=ger");
  setenv("HTTP_COOKIE", "x=y", 1);
  EXPECT_EQ(QeloCgiLoadInCookies(&context), 1);
  const QeloCgiAuthFlags flags{1, 0};
  char user[8];
  EXPECT_EQ(QeloCgiIsAuthorizedEx(&context, &flags, user, sizeof user, 0, 0), -2);
  EXPECT_STREQ(QeloCgiGetLang(&context), "enu");
}

TEST_F(CgiContext, CopyOfTheBytesIsTheSameContext) {
  const std::string id = Create().id;
  QeloCgiContext context = Load("id=" + id);
  QeloCgiContext copy;
  memcpy(copy.block, context.block, sizeof copy.block);
  memset(context.block, 0, sizeof context.block);
  const QeloCgiAuthFlags flags{1, 0};
  char user[64];
  EXPECT_EQ(QeloCgiIsAuthorizedEx(&copy, &flags, user, sizeof user, 0, 1), 1);
}

TEST_F(CgiContext, LanguageIsTheCookiesWhenItIsKnown) {
  EXPECT_EQ(LanguageOf("lang=ger"), "ger");
  EXPECT_EQ(LanguageOf("lang=tha; id="), "tha");
  EXPECT_EQ(LanguageOf("lang=enu"), "enu");
  EXPECT_EQ(LanguageOf("lang=jpn; lang=ger"), "ger");
}

TEST_F(CgiContext, LanguageIsTheSettingsWhenTheCookieIsUnknown) {
  Set({{"language", "fre"}});
  EXPECT_EQ(LanguageOf(""), "fre");
  EXPECT_EQ(LanguageOf("lang=xxx"), "fre");
  EXPECT_EQ(LanguageOf("lang=german"), "fre");
  EXPECT_EQ(LanguageOf("lang="), "fre");
  EXPECT_STREQ(QeloCgiGetLang(nullptr), "fre");
}

TEST_F(CgiContext, LanguageIsEnglishWhenNothingElseIsKnown) {
  Set({{"language", "klingon"}});
  EXPECT_EQ(LanguageOf("lang=xxx"), "enu");
  Set({});
  EXPECT_EQ(LanguageOf(""), "enu");
}

TEST_F(CgiContext, EveryKnownLanguageIsTaken) {
  for (const char* code :
       {"enu", "cht", "chs", "krn", "ger", "fre", "ita", "spn", "jpn", "dan", "nor",
        "sve", "nld", "rus", "plk", "ptb", "ptg", "hun", "trk", "csy", "tha"}) {
    EXPECT_EQ(LanguageOf(std::string("lang=") + code), code);
  }
}

TEST_F(CgiContext, TokenIsDemandedUnlessTheSettingSaysNo) {
  const auto enabled = [](const char* setting) {
    Set({{"enable_token", setting}});
    return QeloCgiIsTokenEnable(nullptr);
  };
  Set({});
  EXPECT_EQ(QeloCgiIsTokenEnable(nullptr), 1);
  EXPECT_EQ(enabled("yes"), 1);
  EXPECT_EQ(enabled("no"), 0);
  EXPECT_EQ(enabled("NO"), 0);
  EXPECT_EQ(enabled("off"), 1);
  EXPECT_EQ(enabled(""), 1);
}

TEST_F(CgiContext, AccessTokenOfAHeaderBecomesTheVariable) {
  QeloCgiContext context;
  EXPECT_EQ(QeloCgiInit("", &context), 1);
  EXPECT_EQ(getenv("qeloAccessToken"), nullptr);
  setenv("HTTP_X_QELO_ACCESS_TOKEN", "T", 1);
  setenv("qeloAccessToken", "before", 1);
  EXPECT_EQ(QeloCgiInit("", &context), 1);
  EXPECT_STREQ(getenv("qeloAccessToken"), "T");
  EXPECT_EQ(getenv("HTTP_X_QELO_ACCESS_TOKEN"), nullptr);
  EXPECT_EQ(QeloCgiInit("", &context), 1);
  EXPECT_STREQ(getenv("qeloAccessToken"), "T");
}

}  // namespace
