#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tokens/Fixture.h"

namespace {

using AccessTokens = TokenTest;

TEST_F(AccessTokens, TokenStandsForItsUser) {
  EXPECT_EQ(Grant(Create()), 1);
  EXPECT_STREQ(user_, "alice");
  EXPECT_EQ(Grant(Create("bob")), 1);
  EXPECT_STREQ(user_, "bob");
}

TEST_F(AccessTokens, UnknownTokenIsRefused) {
  EXPECT_EQ(Grant(std::string(43, 'a')), -1);
  Create();
  EXPECT_EQ(Grant(std::string(43, 'a')), -1);
}

TEST_F(AccessTokens, WithoutDatabaseNoneIsMade) {
  EXPECT_EQ(Grant(std::string(43, 'a')), -1);
  EXPECT_FALSE(std::filesystem::exists(Database()));
  EXPECT_EQ(SyslogCapture::Count(""), 0);
}

TEST_F(AccessTokens, TextThatIsNoTokenIsRefusedWithoutLooking) {
  ASSERT_EQ(remove(Path("modules/tokens.so").c_str()), 0);
  for (const std::string& wrong : {std::string(), std::string("x"), std::string(44, 'a'),
                                   std::string(42, 'a') + "'", std::string(100000, 'a')}) {
    EXPECT_EQ(Grant(wrong), -1);
  }
  EXPECT_EQ(QeloAccessTokenGrant(nullptr, "a", "m", user_, sizeof user_), -1);
  EXPECT_EQ(SyslogCapture::Count("refused to load"), 0);
}

TEST_F(AccessTokens, TokenIsForItsApiAndMethodAlone) {
  const std::string token = Create("alice", "QELO.X", "get");
  EXPECT_EQ(Grant(token, "QELO.X", "get"), 1);
  EXPECT_EQ(Grant(token, "QELO.X", "set"), -3);
  EXPECT_EQ(Grant(token, "QELO.Y", "get"), -3);
  EXPECT_EQ(Grant(token, "QELO.x", "get"), -3);
  EXPECT_EQ(Grant(token, "QELO.X.Y", "get"), -3);
  EXPECT_EQ(Grant(token, "", ""), -3);
  EXPECT_EQ(Grant(Create("alice", "QELO.X", "*"), "QELO.X", "set"), 1);
  EXPECT_EQ(Grant(Create("alice", "*", "get"), "QELO.Y", "get"), 1);
  EXPECT_EQ(Grant(Create("alice", "*", "get"), "QELO.Y", "set"), -3);
}

TEST_F(AccessTokens, ExpiredTokenIsRefused) {
  EXPECT_EQ(Grant(Create("alice", "*", "*", time(nullptr) + 100)), 1);
  EXPECT_EQ(Grant(Create("alice", "*", "*", time(nullptr))), -2);
  EXPECT_EQ(Grant(Create("alice", "*", "*", time(nullptr) - 100)), -2);
}

TEST_F(AccessTokens, TokenOfAUserWhoIsGoneIsRefused) {
  const std::string token = Create();
  Write("etc/passwd", "bob:x:1003:1003::/:/bin/sh\n", 0644);
  EXPECT_EQ(Grant(token), -1);
}

TEST_F(AccessTokens, TokenOfALockedOrExpiredAccountIsRefused) {
  const std::string token = Create();
  for (const std::string& fields :
       {std::string("!:20000:0:99999:7:::"), std::string("!$6$x$y:20000:0:99999:7:::"),
        "$6$x$y:20000:0:99999:7::" + std::to_string(Today()) + ":"}) {
    SetShadow("alice", fields);
    EXPECT_EQ(Grant(token), -1) << fields;
  }
  SetShadow("alice", "$6$x$y:20000:0:99999:7:::");
  EXPECT_EQ(Grant(token), 1);
  ASSERT_EQ(remove(Path("etc/shadow").c_str()), 0);
  EXPECT_EQ(Grant(token), -1);
}

TEST_F(AccessTokens, TokenOfAnAccountThatNobodyLogsInToIsRefused) {
  EXPECT_EQ(Grant(Create("system")), -1);
}

TEST_F(AccessTokens, ServicesTokenIsGoodUntilTheAccountExpires) {
  const std::string token = CreateForService("system");
  EXPECT_EQ(Grant(token), 1);
  EXPECT_STREQ(user_, "system");
  SetShadow("system", "!:20000:0:99999:7:::");
  EXPECT_EQ(Grant(token), 1);
  SetShadow("system", "!:20000:0:99999:7::" + std::to_string(Today()) + ":");
  EXPECT_EQ(Grant(token), -1);
  SetAccount("system", "");
  EXPECT_EQ(Grant(token), -1);
}

TEST_F(AccessTokens, AccountMadeAnewHasNotTheFormerOnesTokens) {
  const std::string token = Create();
  const std::string service = CreateForService("alice");
  SetAccount("alice", "alice:x:2002:2002:Another Alice:/home/alice:/bin/sh");
  EXPECT_EQ(Grant(token), -1);
  EXPECT_EQ(Grant(service), -1);
}

TEST_F(AccessTokens, DatabaseOfTheFirstVersionIsGivenTheIdsOfToday) {
  const std::string token = Create();
  const std::string other = Create("bob");
  const std::string gone = Create("zoe");
  MakeOld();
  EXPECT_EQ(Grant(token), 1);
  EXPECT_STREQ(user_, "alice");
  EXPECT_EQ(Grant(other), 1);
  EXPECT_EQ(Grant(gone), -1);
  SetAccount("alice", "alice:x:2002:2002:Another Alice:/home/alice:/bin/sh");
  EXPECT_EQ(Grant(token), -1);
}

TEST_F(AccessTokens, ProcessesBringADatabaseUpToDateAtTheSameTime) {
  const std::string token = Create();
  MakeOld();
  std::vector<pid_t> children;
  for (int i = 0; i < 8; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      _exit(Grant(token) == 1 ? 0 : 1);
    }
    children.push_back(child);
  }
  for (const pid_t child : children) {
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
}

TEST_F(AccessTokens, DatabaseOfTheSecondVersionKeepsItsScopes) {
  const std::string token = Create("alice", "QELO.X", "get");
  const std::string other = Create("bob");
  MakeSecond();
  EXPECT_EQ(Grant(token), 1);
  EXPECT_EQ(Grant(token, "QELO.X", "set"), -3);
  EXPECT_EQ(Grant(other, "QELO.Y", "set"), 1);
}

TEST_F(AccessTokens, DatabaseOfALaterVersionCannotBeAsked) {
  const std::string token = Create();
  Execute("PRAGMA user_version=3");
  EXPECT_EQ(Grant(token), -4);
  EXPECT_EQ(SyslogCapture::Count("made by a later version"), 1);
}

TEST_F(AccessTokens, NameThatDoesNotFitIsRefused) {
  EXPECT_EQ(Grant(Create(), "a", "m", 5), -3);
  EXPECT_EQ(Grant(Create(), "a", "m", 6), 1);
}

TEST_F(AccessTokens, RevokedTokenIsRefused) {
  int64_t id = 0;
  const std::string token = Create("alice", "*", "*", 0, &id);
  TokenStore store;
  ASSERT_TRUE(store.Open(Database().c_str(), false, NoUid));
  bool found = false;
  EXPECT_TRUE(store.Revoke(id, nullptr, found));
  EXPECT_TRUE(found);
  EXPECT_EQ(Grant(token), -1);
  EXPECT_TRUE(store.Revoke(id, nullptr, found));
  EXPECT_FALSE(found);
}

TEST_F(AccessTokens, DatabaseKeepsNoTokenAndIsForItsOwnerAlone) {
  const std::string token = Create();
  Grant(token);
  int files = 0;
  for (const auto& entry : std::filesystem::directory_iterator(Path("var/lib/webapi"))) {
    const std::string name = "var/lib/webapi/" + entry.path().filename().string();
    if (!entry.path().filename().string().starts_with("tokens.db")) {
      continue;  // another store's
    }
    ++files;
    EXPECT_EQ(Read(name).find(token), std::string::npos) << name;
    EXPECT_EQ(Status(name).st_mode, S_IFREG | 0600U) << name;
  }
  EXPECT_GE(files, 1);
}

TEST_F(AccessTokens, LogIsEmptyOnceNobodyHasItOpen) {
  const std::string token = Create();
  EXPECT_EQ(Status("var/lib/webapi/tokens.db-wal").st_size, 0);
  EXPECT_EQ(Grant(token), 1);  // notes the use
  EXPECT_EQ(Status("var/lib/webapi/tokens.db-wal").st_size, 0);
  const timespec before = Status("var/lib/webapi/tokens.db").st_mtim;
  EXPECT_EQ(Grant(token), 1);
  const timespec after = Status("var/lib/webapi/tokens.db").st_mtim;
  EXPECT_EQ(after.tv_sec * 1000000000 + after.tv_nsec, before.tv_sec * 1000000000 + before.tv_nsec);
}

TEST_F(AccessTokens, BrokenDatabaseCannotBeAsked) {
  Write("var/lib/webapi/tokens.db", std::string(8192, 'x'));
  EXPECT_EQ(Grant(std::string(43, 'a')), -4);
  EXPECT_EQ(SyslogCapture::Count("cannot check an access token [file is not a database]"), 1);
}

TEST_F(AccessTokens, DatabaseThatOthersMayWriteCannotBeAsked) {
  const std::string token = Create();
  ASSERT_EQ(chmod(Database().c_str(), 0620), 0);
  EXPECT_EQ(Grant(token), -4);
  EXPECT_EQ(
      SyslogCapture::Count("cannot check an access token [others may write it or its directory]"),
      1);
}

TEST_F(AccessTokens, EmptyDatabaseCannotBeAsked) {
  Write("var/lib/webapi/tokens.db", "");
  EXPECT_EQ(Grant(std::string(43, 'a')), -4);
  EXPECT_EQ(SyslogCapture::Count("no such table"), 1);
}

TEST_F(AccessTokens, MissingModuleCannotCheck) {
  const std::string token = Create();
  ASSERT_EQ(remove(Path("modules/tokens.so").c_str()), 0);
  EXPECT_EQ(Grant(token), -4);
  EXPECT_EQ(SyslogCapture::Count("refused to load " + Path("modules/tokens.so")), 1);
}

TEST_F(AccessTokens, ProcessesAskAndMakeAtTheSameTime) {
  const std::string token = Create();
  std::vector<pid_t> children;
  for (int i = 0; i < 8; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      int failures = 0;
      for (int n = 0; n < 20; ++n) {
        failures += Grant(i % 2 == 0 ? token : Create()) == 1 ? 0 : 1;
      }
      _exit(failures);
    }
    children.push_back(child);
  }
  for (const pid_t child : children) {
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
}

}  // namespace
