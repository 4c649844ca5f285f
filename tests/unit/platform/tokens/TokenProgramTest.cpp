#include <unistd.h>

#include <cstdio>
#include <filesystem>

#include "programs/webapi-token/Commands.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Token.h"

namespace {

constexpr char kHeadings[] =
    "ID\tUSER\tAPI\tMETHOD\tMADE (UTC)\tGOOD UNTIL (UTC)\tLAST USE (UTC)\tLIMITS\tNAME\n";
constexpr uid_t kOrdinaryUser = 65534;

class TokenProgram : public PrivateRoot {
 protected:
  int Run(const std::vector<std::string>& arguments) {
    FILE* output = fopen(Path("var/output").c_str(), "w");
    FILE* messages = fopen(Path("var/messages").c_str(), "w");
    const int code = QELO::TokenProgram::run(arguments, output, messages);
    fclose(output);
    fclose(messages);
    output_ = Read("var/output");
    messages_ = Read("var/messages");
    return code;
  }

  /// Run() by a user who may neither read nor write what the tokens are in.
  int RunWithoutRights(const std::vector<std::string>& arguments) {
    const std::string closed = Path(HasDatabase() ? "var/lib/webapi/tokens.db" : "var/lib/webapi");
    EXPECT_EQ(chmod(closed.c_str(), HasDatabase() ? 0000 : 0555), 0);
    FILE* output = fopen(Path("var/output").c_str(), "w");
    FILE* messages = fopen(Path("var/messages").c_str(), "w");
    const int code = InChild([&] {
      if (IsRoot() && setresuid(kOrdinaryUser, kOrdinaryUser, kOrdinaryUser) != 0) {
        return -1;
      }
      const int result = QELO::TokenProgram::run(arguments, output, messages);
      fclose(messages);
      return result;
    });
    fclose(output);
    fclose(messages);
    messages_ = Read("var/messages");
    return code;
  }

  static bool HasDatabase() { return std::filesystem::exists(Path("var/lib/webapi/tokens.db")); }

  std::string output_;
  std::string messages_;
};

TEST_F(TokenProgram, CreatePrintsATokenThatWorks) {
  EXPECT_EQ(Run({"create", "--user", "alice"}), 0);
  ASSERT_EQ(output_.size(), 44U);
  EXPECT_EQ(messages_.find("Token 1 of alice, good until: 2"), 0U) << messages_;
  char user[64];
  EXPECT_EQ(QeloAccessTokenGrant(output_.substr(0, 43).c_str(), "QELO.X", "get", user, 64), 1);
  EXPECT_STREQ(user, "alice");
}

TEST_F(TokenProgram, CreateTakesPatternsAndDays) {
  EXPECT_EQ(Run({"create", "--days", "0", "--method", "get", "--api", "QELO.X", "--user", "bob"}),
            0);
  EXPECT_NE(messages_.find("good until: never"), std::string::npos);
  const std::string token = output_.substr(0, 43);
  char user[64];
  EXPECT_EQ(QeloAccessTokenGrant(token.c_str(), "QELO.X", "get", user, 64), 1);
  EXPECT_EQ(QeloAccessTokenGrant(token.c_str(), "QELO.X", "set", user, 64), -3);
}

TEST_F(TokenProgram, CreateTakesLimitsAndAName) {
  EXPECT_EQ(Run({"create", "--user", "bob", "--api", "QELO.Host.*", "--name", "for a script",
                 "--address", "192.0.2.0/24", "--read-only"}),
            0);
  EXPECT_EQ(messages_.find("Token 1 "), 0U) << messages_;
  Write("usr/qelo/qeloman/webapi/QELO.Host.lib",
        R"({"QELO.Host.X": {"methods": {"1": [{"get": {"readOnly": true}}, "set"]}}})", 0644);
  const std::string token = output_.substr(0, 43);
  char user[64];
  EXPECT_EQ(QeloAccessTokenGrant(token.c_str(), "QELO.Host.X", "get", user, 64), 1);
  EXPECT_EQ(QeloAccessTokenGrant(token.c_str(), "QELO.Host.X", "set", user, 64), -3);
  EXPECT_EQ(Run({"list"}), 0);
  EXPECT_NE(output_.find("\tread-only 192.0.2.0/24\tfor a script\n"), std::string::npos) << output_;
  EXPECT_EQ(output_.find("\tnever\t"), std::string::npos) << output_;  // the token has been used
  EXPECT_EQ(Run({"create", "--user", "bob", "--name", "a\nb"}), 2);
  EXPECT_EQ(Run({"create", "--user", "bob", "--address", "192.0.2.0/33"}), 2);
}

TEST_F(TokenProgram, CreateMakesTheDirectory) {
  std::filesystem::remove_all(Path("var/lib"));
  EXPECT_EQ(Run({"create", "--user", "alice"}), 0);
  EXPECT_EQ(Status("var/lib/webapi").st_mode, S_IFDIR | 0711U);
}

TEST_F(TokenProgram, CreateSaysWhatIsWrongAndMakesNothing) {
  const auto wrong = [this](std::vector<std::string> options) {
    options.insert(options.begin(), "create");
    EXPECT_EQ(Run(options), 2);
    EXPECT_EQ(output_, "");
    return messages_;
  };
  EXPECT_EQ(wrong({}), "webapi-token: --user is missing; see webapi-token --help\n");
  EXPECT_NE(wrong({"--user", ""}).find("--user is missing"), std::string::npos);
  EXPECT_NE(wrong({"--user"}).find("--user needs a value"), std::string::npos);
  EXPECT_NE(wrong({"alice"}).find("alice is no option of create"), std::string::npos);
  for (const char* days : {"-1", "x", "1.5", "", "36501", "99999999999"}) {
    EXPECT_NE(wrong({"--user", "alice", "--days", days}).find("--days takes a number"),
              std::string::npos)
        << days;
  }
  for (const char* name : {"", "*.X", "QELO.*.X", "**", "a b"}) {
    EXPECT_NE(wrong({"--user", "alice", "--api", name}).find("take a whole name"),
              std::string::npos);
    EXPECT_NE(wrong({"--user", "alice", "--method", name}).find("take a whole name"),
              std::string::npos);
  }
  EXPECT_FALSE(HasDatabase());
}

TEST_F(TokenProgram, CreateForAnUnknownUserFails) {
  EXPECT_EQ(Run({"create", "--user", "zoe"}), 1);
  EXPECT_EQ(messages_, "webapi-token: there is no user zoe\n");
  EXPECT_FALSE(HasDatabase());
}

TEST_F(TokenProgram, CreateForAnAccountThatNobodyLogsInToAsksForService) {
  EXPECT_EQ(Run({"create", "--user", "system"}), 1);
  EXPECT_EQ(messages_,
            "webapi-token: the account system is not for logins; --service makes a token for such "
            "an account\n");
  SetShadow("alice", "!$6$x$y:20000:0:99999:7:::");
  EXPECT_EQ(Run({"create", "--user", "alice"}), 1);
  EXPECT_NE(messages_.find("the account alice is locked; --service"), std::string::npos);
  EXPECT_FALSE(HasDatabase());
  EXPECT_EQ(Run({"create", "--service", "--user", "system"}), 0);
  const std::string token = output_.substr(0, 43);
  char user[64];
  EXPECT_EQ(QeloAccessTokenGrant(token.c_str(), "QELO.X", "get", user, 64), 1);
  EXPECT_EQ(Run({"list"}), 0);
  EXPECT_NE(output_.find("\n1\tsystem (service)\t*\t*\t2"), std::string::npos) << output_;
}

TEST_F(TokenProgram, CreateForAnExpiredAccountFails) {
  SetShadow("alice", "$6$x$y:20000:0:99999:7::" + std::to_string(Today()) + ":");
  for (const std::vector<std::string>& options :
       {std::vector<std::string>{"create", "--user", "alice"},
        {"create", "--user", "alice", "--service"}}) {
    EXPECT_EQ(Run(options), 1);
    EXPECT_EQ(messages_, "webapi-token: the account alice is expired\n");
  }
}

TEST_F(TokenProgram, CreateForAnApiWithoutDescriptionWarns) {
  Write("usr/qelo/qeloman/webapi/QELO.X.lib", R"({"QELO.X": {}, "QELO.X.Y": {}})");
  for (const char* api : {"QELO.X", "QELO.X.Y", "*"}) {
    EXPECT_EQ(Run({"create", "--user", "alice", "--api", api}), 0);
    EXPECT_EQ(messages_.find("Token "), 0U) << messages_;
  }
  for (const std::string api : {"QELO.X.Z", "Nope.Nope", "nope", "../webapi/QELO.X"}) {
    EXPECT_EQ(Run({"create", "--user", "alice", "--api", api}), 0);
    EXPECT_EQ(output_.size(), 44U);
    EXPECT_EQ(messages_.find("webapi-token: there is no API " + api + "; "), 0U) << messages_;
  }
}

TEST_F(TokenProgram, CreateLooksForTheDescriptionWhereCallsDo) {
  Write("usr/qelo/qeloman/webapi/Q.lib", R"({"Q.A": {}, "Q.A.B": {}})");
  Write("usr/qelo/qeloman/webapi/Q.A.B.C.D.E.lib", R"({"Q.A.B.C.D.E": {}})");
  for (const char* api : {"Q.A", "Q.A.B", "Q.A.B.C.D.E"}) {
    EXPECT_EQ(Run({"create", "--user", "alice", "--api", api}), 0);
    EXPECT_EQ(messages_.find("webapi-token: there is no API "), 0U) << api << ": " << messages_;
  }
  Write("usr/qelo/qeloman/webapi/Q.A.lib", R"({"Q.A": {}, "Q.A.B": {}, "Q.A.B.C.D.E": {}})");
  for (const char* api : {"Q.A", "Q.A.B", "Q.A.B.C.D.E"}) {
    EXPECT_EQ(Run({"create", "--user", "alice", "--api", api}), 0);
    EXPECT_EQ(messages_.find("Token "), 0U) << api << ": " << messages_;
  }
}

TEST_F(TokenProgram, CallsWithoutRightsSaySo) {
  EXPECT_EQ(RunWithoutRights({"create", "--user", "alice"}), 1);
  EXPECT_NE(messages_.find("; root's rights are needed\n"), std::string::npos) << messages_;
  EXPECT_EQ(chmod(Path("var/lib/webapi").c_str(), 0711), 0);
  ASSERT_EQ(Run({"create", "--user", "alice"}), 0);
  EXPECT_EQ(RunWithoutRights({"list"}), 1);
  EXPECT_EQ(messages_, "webapi-token: " + Path("var/lib/webapi/tokens.db") +
                           ": unable to open database file; root's rights are needed\n");
}

TEST_F(TokenProgram, ListShowsEverythingButTheTokens) {
  ASSERT_EQ(Run({"create", "--user", "alice"}), 0);
  const std::string token = output_.substr(0, 43);
  ASSERT_EQ(Run({"create", "--user", "bob", "--api", "QELO.X", "--days", "0"}), 0);
  EXPECT_EQ(Run({"list"}), 0);
  EXPECT_EQ(output_.find(kHeadings), 0U) << output_;
  EXPECT_NE(output_.find("\n1\talice\t*\t*\t2"), std::string::npos) << output_;
  EXPECT_NE(output_.find("\n2\tbob\tQELO.X\t*\t2"), std::string::npos) << output_;
  EXPECT_NE(output_.find("\tnever\tnever\t\t\n"), std::string::npos) << output_;
  EXPECT_EQ(output_.find(token), std::string::npos);
}

TEST_F(TokenProgram, ListWithoutTokensHasHeadingsAlone) {
  EXPECT_EQ(Run({"list"}), 0);
  EXPECT_EQ(output_, kHeadings);
  EXPECT_FALSE(HasDatabase());
}

TEST_F(TokenProgram, RevokeRemovesTheToken) {
  ASSERT_EQ(Run({"create", "--user", "alice"}), 0);
  const std::string token = output_.substr(0, 43);
  EXPECT_EQ(Run({"revoke", "1"}), 0);
  char user[64];
  EXPECT_EQ(QeloAccessTokenGrant(token.c_str(), "QELO.X", "get", user, 64), -1);
  EXPECT_EQ(Run({"revoke", "1"}), 1);
  EXPECT_EQ(messages_, "webapi-token: there is no token 1\n");
}

TEST_F(TokenProgram, NumbersOfRevokedTokensAreNotGivenAgain) {
  ASSERT_EQ(Run({"create", "--user", "alice"}), 0);
  ASSERT_EQ(Run({"revoke", "1"}), 0);
  ASSERT_EQ(Run({"create", "--user", "alice"}), 0);
  EXPECT_EQ(messages_.find("Token 2 "), 0U);
}

TEST_F(TokenProgram, RevokeOfNothingFails) {
  EXPECT_EQ(Run({"revoke", "7"}), 1);
  EXPECT_EQ(messages_, "webapi-token: there is no token 7\n");
  for (const char* number : {"0", "-1", "x", "1x", ""}) {
    EXPECT_EQ(Run({"revoke", number}), 2) << number;
  }
}

TEST_F(TokenProgram, BrokenDatabaseIsNamed) {
  Write("var/lib/webapi/tokens.db", std::string(8192, 'x'));
  for (const std::vector<std::string>& command :
       {std::vector<std::string>{"list"}, {"revoke", "1"}, {"create", "--user", "alice"}}) {
    EXPECT_EQ(Run(command), 1);
    EXPECT_EQ(messages_,
              "webapi-token: " + Path("var/lib/webapi/tokens.db") + ": file is not a database\n");
  }
}

TEST_F(TokenProgram, DatabaseThatCannotBeMadeIsNamed) {
  std::filesystem::remove_all(Path("var/lib/webapi"));
  Write("var/lib/webapi", "");
  EXPECT_EQ(Run({"create", "--user", "alice"}), 1);
  EXPECT_NE(messages_.find("tokens.db: unable to open database file"), std::string::npos)
      << messages_;
}

TEST_F(TokenProgram, HelpTellsTheCommandsAndHowTokensAreSent) {
  for (const std::vector<std::string>& call :
       {std::vector<std::string>{"--help"}, {"-h"}, {"create", "--help"}, {"list", "-h"}}) {
    EXPECT_EQ(Run(call), 0);
    EXPECT_EQ(messages_, "");
    for (const char* text : {"create --user", "list", "revoke ID", "tid=TOKEN"}) {
      EXPECT_NE(output_.find(text), std::string::npos) << text;
    }
  }
}

TEST_F(TokenProgram, OtherCommandsAreWrongUse) {
  EXPECT_EQ(Run({}), 2);
  EXPECT_EQ(messages_, "webapi-token: a command is missing; see webapi-token --help\n");
  EXPECT_EQ(Run({"destroy"}), 2);
  EXPECT_EQ(Run({"list", "all"}), 2);
  EXPECT_EQ(Run({"revoke"}), 2);
}

}  // namespace
