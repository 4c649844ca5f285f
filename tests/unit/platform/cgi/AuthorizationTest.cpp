#include <unistd.h>

#include <cstring>
#include <filesystem>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/login/SessionFixture.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Cgi.h"

namespace {

constexpr QeloCgiAuthFlags kFromCookie{0, 0};
constexpr QeloCgiAuthFlags kFromParameter{1, 0};

class Authorization : public SessionFixture {
 protected:
  struct Call {
    QeloCgiAuthFlags flags = kFromParameter;
    int allowTimeout = 0;
    int checkAddress = 1;
    int size = 493;
  };

  static QeloCgiContext ContextOf(const std::string& id) {
    QeloCgiContext context{};
    setenv("HTTP_COOKIE", ("id=" + id).c_str(), 1);
    QeloCgiLoadInCookies(&context);
    return context;
  }

  int Check(const std::string& id, const Call& call) {
    QeloCgiContext context = ContextOf(id);
    strcpy(user_, "before");
    return QeloCgiIsAuthorizedEx(&context, &call.flags, user_, call.size, call.allowTimeout,
                                 call.checkAddress);
  }
  int Check(const std::string& id) { return Check(id, Call()); }

  static std::string Option(const std::string& id, const char* name, int size = 200) {
    QeloCgiContext context = ContextOf(id);
    char value[200] = "before";
    const int found = QeloCgiGetOption(&context, name, value, size);
    EXPECT_TRUE(found == 1 || (found == 0 && value[0] == '\0')) << found << value;
    return found == 1 ? value : "none";
  }

  /// A session file with this content. @return its id
  static std::string WriteSession(const std::string& text) {
    std::string id(43, 'A');
    Write("run/webapi/sessions/" + id, text);
    return id;
  }

  char user_[493] = "";
};

TEST_F(Authorization, SessionFromItsAddressIsAuthorized) {
  EXPECT_EQ(Check(Create().id), 1);
  EXPECT_STREQ(user_, "alice");
}

TEST_F(Authorization, NoIdIsMinusTwo) {
  EXPECT_EQ(Check(""), -2);
  EXPECT_STREQ(user_, "");
}

TEST_F(Authorization, MalformedIdIsMinusFour) {
  Write("run/webapi/x", R"({"user":"alice","token":")" + std::string(43, 't') + "\"}");
  for (const std::string& id : {std::string("x"), std::string(44, 'a'), std::string(4000, 'a'),
                                std::string("../x"), "../../../etc/" + std::string(30, 'a'),
                                std::string(42, 'a') + "/", std::string(42, 'a') + "."}) {
    EXPECT_EQ(Check(id), -4) << id;
    EXPECT_STREQ(user_, "");
  }
}

TEST_F(Authorization, UnknownIdIsMinusFive) {
  EXPECT_EQ(Check(std::string(43, 'a')), -5);
  EXPECT_STREQ(user_, "");
  std::filesystem::remove_all(Path("run"));
  EXPECT_EQ(Check(std::string(43, 'a')), -5);
}

TEST_F(Authorization, BrokenRecordIsMinusThree) {
  const std::string token(43, 't');
  for (const std::string& text :
       {std::string(), std::string("{"), std::string("[]"), std::string("\"alice\""),
        std::string(R"({"user":"alice"})"), R"({"token":")" + token + "\"}",
        R"({"user":"","token":")" + token + "\"}", R"({"user":["alice"],"token":")" + token + "\"}",
        std::string(R"({"user":"alice","token":"short"})"),
        R"({"user":"alice","token":")" + token + "\",\"x\":\"" + std::string(5000, 'x') + "\"}",
        std::string(5000, '[')}) {
    EXPECT_EQ(Check(WriteSession(text)), -3) << text;
    EXPECT_STREQ(user_, "");
  }
}

TEST_F(Authorization, SymbolicLinkWithASessionsNameIsMinusThree) {
  const Ticket ticket = Create();
  std::filesystem::rename(Path(File(ticket)), Path("etc/record"));
  ASSERT_EQ(symlink(Path("etc/record").c_str(), Path(File(ticket)).c_str()), 0);
  EXPECT_EQ(Check(ticket.id), -3);
  EXPECT_STREQ(user_, "");
}

TEST_F(Authorization, DirectoryAndPipeWithASessionsNameAreMinusThree) {
  const std::string id(43, 'A');
  std::filesystem::create_directory(Path("run/webapi/sessions/" + id));
  EXPECT_EQ(Check(id), -3);
  const std::string pipe(43, 'B');
  ASSERT_EQ(mkfifo(Path("run/webapi/sessions/" + pipe).c_str(), 0600), 0);
  EXPECT_EQ(Check(pipe), -3);
}

TEST_F(Authorization, DirectoryThatOthersMayUseIsMinusThree) {
  const Ticket ticket = Create();
  ASSERT_EQ(chmod(Path("run/webapi/sessions").c_str(), 0770), 0);
  EXPECT_EQ(Check(ticket.id), -3);
  EXPECT_EQ(SyslogCapture::Count("cannot use " + Path("run/webapi/sessions") +
                                 " [Operation not permitted]"),
            1);
}

TEST_F(Authorization, UserWhoIsGoneIsMinusFive) {
  const Ticket ticket = Create();
  Write("etc/passwd", "bob:x:1003:1003::/:/bin/sh\n", 0644);
  EXPECT_EQ(Check(ticket.id), -5);
  EXPECT_STREQ(user_, "");
}

TEST_F(Authorization, LockedAccountIsMinusSixUntilItIsUnlocked) {
  const Ticket ticket = Create();
  for (const std::string& lock : {std::string("!"), std::string("!!"), std::string("!$6$x$y")}) {
    SetShadow("alice", lock + ":20000:0:99999:7:::");
    EXPECT_EQ(Check(ticket.id), -6) << lock;
    EXPECT_STREQ(user_, "");
  }
  SetShadow("alice", "$6$x$y:20000:0:99999:7:::");
  EXPECT_EQ(Check(ticket.id), 1);
}

TEST_F(Authorization, AccountWithoutPasswordOfItsOwnIsNotLocked) {
  const Ticket ticket = Create();
  SetShadow("alice", "*:20000:0:99999:7:::");
  EXPECT_EQ(Check(ticket.id), 1);
  SetShadow("alice", "");
  EXPECT_EQ(Check(ticket.id), 1);
}

TEST_F(Authorization, ExpiredAccountIsMinusSix) {
  const Ticket ticket = Create();
  SetShadow("alice", "$6$x$y:20000:0:99999:7::" + std::to_string(Today() + 1) + ":");
  EXPECT_EQ(Check(ticket.id), 1);
  SetShadow("alice", "$6$x$y:20000:0:99999:7::" + std::to_string(Today()) + ":");
  EXPECT_EQ(Check(ticket.id), -6);
  SetShadow("alice", "$6$x$y:" + std::to_string(Today() - 31) + ":0:20:7:11::");
  EXPECT_EQ(Check(ticket.id), 1);
  SetShadow("alice", "$6$x$y:" + std::to_string(Today() - 31) + ":0:20:7:10::");
  EXPECT_EQ(Check(ticket.id), -6);
}

TEST_F(Authorization, PasswordThatMustBeChangedEndsNoSession) {
  const Ticket ticket = Create();
  for (const std::string& changed : {std::string("0"), std::to_string(Today() - 31)}) {
    SetShadow("alice", "$6$x$y:" + changed + ":0:30:7:::");
    EXPECT_EQ(Check(ticket.id), 1) << changed;
  }
}

TEST_F(Authorization, AccountWhoseShellWasTakenIsMinusSix) {
  const Ticket ticket = Create();
  const std::string ids = std::to_string(IsRoot() ? 1002 : geteuid()) + ":" +
                          std::to_string(IsRoot() ? 1002 : getegid());
  SetAccount("alice", "alice:x:" + ids + ":Alice:/home/alice:/usr/sbin/nologin");
  EXPECT_EQ(Check(ticket.id), -6);
  SetAccount("alice", "alice:x:" + ids + ":Alice:/home/alice:/bin/bash");
  EXPECT_EQ(Check(ticket.id), 1);
}

TEST_F(Authorization, AccountMadeAnewHasNotTheFormerOnesSessions) {
  const Ticket ticket = Create();
  SetAccount("alice", "alice:x:2002:2002:Another Alice:/home/alice:/bin/sh");
  EXPECT_EQ(Check(ticket.id), -5);
  EXPECT_STREQ(user_, "");
  EXPECT_EQ(Check(Create().id), 1);
}

TEST_F(Authorization, RecordWithoutTheUsersIdIsMinusFive) {
  const std::string token = R"("token":")" + std::string(43, 't') + "\"";
  for (const char* uid : {"", R"("uid":"1002",)", R"("uid":-1,)", R"("uid":1002.5,)",
                          R"("uid":4294967295,)", R"("uid":null,)"}) {
    EXPECT_EQ(Check(WriteSession(R"({"user":"alice",)" + std::string(uid) + token + "}"),
                    {.checkAddress = 0}),
              -5)
        << uid;
  }
}

TEST_F(Authorization, UnreadableShadowFileIsMinusSix) {
  const Ticket ticket = Create();
  ASSERT_EQ(remove(Path("etc/shadow").c_str()), 0);
  EXPECT_EQ(Check(ticket.id), -6);
}

TEST_F(Authorization, UnreadableAccountsAreMinusSix) {
  const Ticket ticket = Create();
  ASSERT_EQ(remove(Path("etc/passwd").c_str()), 0);
  EXPECT_EQ(Check(ticket.id), -6);
}

TEST_F(Authorization, NameThatDoesNotFitIsMinusSix) {
  const Ticket ticket = Create();
  EXPECT_EQ(Check(ticket.id, {.size = 5}), -6);
  EXPECT_STREQ(user_, "");
  EXPECT_EQ(Check(ticket.id, {.size = 6}), 1);
  EXPECT_EQ(Check(ticket.id, {.size = 0}), -6);
}

TEST_F(Authorization, MissingContextOrFlagsAreMinusSix) {
  QeloCgiContext context = ContextOf(Create().id);
  EXPECT_EQ(QeloCgiIsAuthorizedEx(nullptr, &kFromCookie, user_, sizeof user_, 0, 1), -6);
  EXPECT_EQ(QeloCgiIsAuthorizedEx(&context, nullptr, user_, sizeof user_, 0, 1), -6);
}

TEST_F(Authorization, OtherAddressIsMinusEight) {
  const Ticket ticket = Create();
  setenv("REMOTE_ADDR", "192.0.2.8", 1);
  EXPECT_EQ(Check(ticket.id), -8);
  unsetenv("REMOTE_ADDR");
  EXPECT_EQ(Check(ticket.id), -8);
}

TEST_F(Authorization, OtherSpellingOfTheAddressIsTheSame) {
  const Ticket ticket = Create();
  setenv("REMOTE_ADDR", (std::string("::ffff:") + kAddress).c_str(), 1);
  EXPECT_EQ(Check(ticket.id), 1);
  const Ticket v6 = Create("alice", "2001:DB8:0::1");
  setenv("REMOTE_ADDR", "2001:db8::1", 1);
  EXPECT_EQ(Check(v6.id), 1);
}

TEST_F(Authorization, AddressIsNotLookedAtWhenItIsNotToBeChecked) {
  const Ticket ticket = Create();
  setenv("REMOTE_ADDR", "192.0.2.8", 1);
  EXPECT_EQ(Check(ticket.id, {.checkAddress = 0}), 1);
}

TEST_F(Authorization, UnboundSessionIsGoodFromEverywhere) {
  Set({{"skip_check_ip", "yes"}});
  const Ticket ticket = Create();
  setenv("REMOTE_ADDR", "192.0.2.8", 1);
  EXPECT_EQ(Check(ticket.id), 1);
}

TEST_F(Authorization, BoundSessionStaysBoundWhenTheSettingChanges) {
  const Ticket ticket = Create();
  Set({{"skip_check_ip", "yes"}});
  setenv("REMOTE_ADDR", "192.0.2.8", 1);
  EXPECT_EQ(Check(ticket.id), -8);
}

TEST_F(Authorization, TimedOutIsMinusOneUntilTheFileIsGone) {
  const Ticket ticket = Create();
  Age(File(ticket), 902);
  EXPECT_EQ(Check(ticket.id), -1);
  EXPECT_EQ(Check(ticket.id), -1);
  ASSERT_EQ(remove(Path(File(ticket)).c_str()), 0);
  EXPECT_EQ(Check(ticket.id), -5);
}

TEST_F(Authorization, TimedOutIsTwoWithAllowanceAndDoesNotRevive) {
  const Ticket ticket = Create();
  Age(File(ticket), 902);
  EXPECT_EQ(Check(ticket.id, {.allowTimeout = 1}), 2);
  EXPECT_STREQ(user_, "alice");
  EXPECT_EQ(Check(ticket.id), -1);
}

TEST_F(Authorization, IdleCheckIsNotCountedAsUse) {
  const Ticket ticket = Create();
  Age(File(ticket), 800);
  const auto before = Status(File(ticket)).st_mtim.tv_sec;
  EXPECT_EQ(Check(ticket.id, {.flags = {1, 1}}), 1);
  EXPECT_EQ(Status(File(ticket)).st_mtim.tv_sec, before);
  Age(File(ticket), 902);
  EXPECT_EQ(Check(ticket.id, {.flags = {1, 1}}), -1);
}

TEST_F(Authorization, UseIsCountedOnSuccessOnly) {
  const Ticket ticket = Create();
  Age(File(ticket), 800);
  const auto idle = [&] { return time(nullptr) - Status(File(ticket)).st_mtim.tv_sec; };
  EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie}), -7);
  EXPECT_GE(idle(), 800);
  setenv("REMOTE_ADDR", "192.0.2.8", 1);
  EXPECT_EQ(Check(ticket.id), -8);
  EXPECT_GE(idle(), 800);
  setenv("REMOTE_ADDR", kAddress, 1);
  EXPECT_EQ(Check(ticket.id), 1);
  EXPECT_LE(idle(), 2);
}

TEST_F(Authorization, SessionByCookieNeedsItsToken) {
  const Ticket ticket = Create();
  EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie}), -7);
  for (const std::string& wrong : {std::string(), std::string("x"), Create().token,
                                   ticket.token.substr(0, 42), ticket.token + "x"}) {
    setenv("HTTP_X_QELO_TOKEN", wrong.c_str(), 1);
    EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie}), -7) << wrong;
  }
  setenv("HTTP_X_QELO_TOKEN", ticket.token.c_str(), 1);
  EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie}), 1);
}

TEST_F(Authorization, TimedOutSessionByCookieNeedsItsTokenToo) {
  const Ticket ticket = Create();
  Age(File(ticket), 902);
  EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie, .allowTimeout = 1}), -7);
  setenv("HTTP_X_QELO_TOKEN", ticket.token.c_str(), 1);
  EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie, .allowTimeout = 1}), 2);
}

TEST_F(Authorization, NoTokenIsNeededWhenSwitchedOff) {
  Set({{"enable_token", "no"}});
  EXPECT_EQ(Check(Create().id, {.flags = kFromCookie}), 1);
}

TEST_F(Authorization, AddressComesBeforeTimeoutAndTimeoutBeforeToken) {
  const Ticket ticket = Create();
  Age(File(ticket), 902);
  setenv("REMOTE_ADDR", "192.0.2.8", 1);
  EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie}), -8);
  setenv("REMOTE_ADDR", kAddress, 1);
  EXPECT_EQ(Check(ticket.id, {.flags = kFromCookie}), -1);
}

TEST_F(Authorization, OptionsOfASession) {
  const Ticket ticket = Create();
  EXPECT_EQ(Option(ticket.id, "timeout"), "900");
  EXPECT_EQ(Option(ticket.id, "istimeout"), "0");
  EXPECT_EQ(Option(ticket.id, "skipcheckip"), "0");
  EXPECT_EQ(Option(ticket.id, "sessfile"), Path(File(ticket)));
  EXPECT_EQ(Option(ticket.id, "app"), "none");
  EXPECT_EQ(Option(ticket.id, "webapi"), "none");
  EXPECT_EQ(Option(ticket.id, "unknown"), "none");
  EXPECT_EQ(Option(ticket.id, ""), "none");
}

TEST_F(Authorization, OptionsFollowTheSessionAndTheSettings) {
  Set({{"skip_check_ip", "yes"}, {"session_timeout", "60"}});
  const Ticket ticket = Create();
  Age(File(ticket), 62);
  EXPECT_EQ(Option(ticket.id, "timeout"), "60");
  EXPECT_EQ(Option(ticket.id, "istimeout"), "1");
  EXPECT_EQ(Option(ticket.id, "skipcheckip"), "1");
}

TEST_F(Authorization, OptionsThatTheRecordNames) {
  const std::string id =
      WriteSession(R"({"user":"alice","app":"QELO.App","webapi":"full","token":")" +
                   std::string(43, 't') + "\"}");
  EXPECT_EQ(Option(id, "app"), "QELO.App");
  EXPECT_EQ(Option(id, "webapi"), "full");
}

TEST_F(Authorization, OptionsNeedASession) {
  for (const std::string& id : {std::string(), std::string("x"), std::string(43, 'a')}) {
    EXPECT_EQ(Option(id, "timeout"), "none") << id;
  }
  char value[8] = "before";
  EXPECT_EQ(QeloCgiGetOption(nullptr, "timeout", value, sizeof value), 0);
  EXPECT_STREQ(value, "");
}

TEST_F(Authorization, OptionThatDoesNotFitIsNotGiven) {
  const Ticket ticket = Create();
  EXPECT_EQ(Option(ticket.id, "sessfile", 20), "none");
  EXPECT_EQ(Option(ticket.id, "timeout", 4), "900");
  EXPECT_EQ(Option(ticket.id, "timeout", 3), "none");
}

}  // namespace
