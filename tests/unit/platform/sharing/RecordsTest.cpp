// The records of link, session and token that a request asks for; and the database when others hold
// it.

#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>

#include "tests/unit/platform/DatabaseProgram.h"
#include "tests/unit/platform/sharing/Fixture.h"

using namespace QELO::sharing;

namespace {

class Records : public SharingLinks {
 protected:
  db::SharingDB& database = db::SharingDB::Instance();
  record::Entry entry;
  record::Session session;
  record::Token token;
};

TEST_F(Records, DatabaseIsNotGoodBeforeTheFirstLink) {
  EXPECT_FALSE(database.IsGood());
  EXPECT_FALSE(db::EntryDB(database).GetByHash(kNoSecret, entry));
  Make();
  EXPECT_TRUE(database.IsGood());
}

TEST_F(Records, AreFilledFromTheDatabase) {
  const Json::Value link =
      Make(R"({"path": "/p", "protect": "owner", "matchAddress": false, "upload": true})");
  const std::string sid = SessionFor(link);
  db::EntryDB entries(database);
  db::SessionDB sessions(database);
  db::TokenDB tokens(database);
  ASSERT_TRUE(entries.GetByHash(link["link"].asString(), entry));
  ASSERT_TRUE(sessions.GetBySessionId(sid, session));
  ASSERT_TRUE(tokens.GetBySessionEntry(session, entry, token));
  EXPECT_EQ(entry.get_project_name(), "files");
  EXPECT_EQ(entry.get_owner_name(), "alice");
  EXPECT_EQ(entry.get_protect_type(), SHARING_PROTECT_OWNER);
  EXPECT_FALSE(entry.get_enable_match_ip());
  EXPECT_EQ(entry.get_path(), "/p");
  EXPECT_TRUE(entry.get_allow_upload());
  EXPECT_EQ(session.get_owner_uid(), entry.get_owner_uid());
  EXPECT_NEAR(static_cast<double>(session.get_timeout()), static_cast<double>(time(nullptr) + 3600),
              5);
  EXPECT_NEAR(static_cast<double>(token.get_opened()), static_cast<double>(time(nullptr)), 5);
}

TEST_F(Records, ThatAreNotFoundStayAsTheyWere) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  db::EntryDB entries(database);
  db::SessionDB sessions(database);
  db::TokenDB tokens(database);
  ASSERT_TRUE(entries.GetByHash(link["link"].asString(), entry));
  ASSERT_TRUE(sessions.GetBySessionId(sid, session));
  for (const char* id : {kNoSecret, "", "x"}) {
    EXPECT_FALSE(entries.GetByHash(id, entry));
    EXPECT_FALSE(sessions.GetBySessionId(id, session));
  }
  EXPECT_EQ(entry.get_project_name(), "files");
  EXPECT_NE(session.get_id(), 0);
  EXPECT_FALSE(tokens.GetBySessionEntry(record::Session(), entry, token));
  EXPECT_FALSE(tokens.GetBySessionEntry(session, record::Entry(), token));
  EXPECT_EQ(token.get_opened(), 0);
}

/// Descriptors of this process that lead to the database or its companions.
int openFiles() {
  int count = 0;
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    std::error_code gone;
    const std::string file = std::filesystem::read_symlink(entry, gone);
    count += file.find("sharing.db") != std::string::npos ? 1 : 0;
  }
  return count;
}

TEST_F(Records, AskingOnceOpensTheDatabaseForTheCheckToo) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  ASSERT_TRUE(db::EntryDB(database).GetByHash(link["link"].asString(), entry));
  const int open = openFiles();
  EXPECT_GT(open, 0);
  ASSERT_TRUE(db::SessionDB(database).GetBySessionId(sid, session));
  EXPECT_EQ(openFiles(), open);
  ASSERT_EQ(remove(Path("modules/sharing.so").c_str()), 0);  // it could not be opened again
  EXPECT_EQ(Ask(link, sid), 1);
  EXPECT_EQ(openFiles(), 0);
}

TEST_F(Records, DatabaseIsClosedBeforeTheProcessForks) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  ASSERT_TRUE(db::EntryDB(database).GetByHash(link["link"].asString(), entry));
  ASSERT_GT(openFiles(), 0);
  const pid_t child = fork();
  if (child == 0) {
    _exit(openFiles() == 0 && Ask(link, sid) == 1 ? 0 : 1);
  }
  int status = -1;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(openFiles(), 0);
  EXPECT_EQ(Ask(link, sid), 1);
}

TEST_F(Records, AnotherDatabaseInItsPlaceIsTheOneThatIsAsked) {
  const Json::Value link = Make();
  ASSERT_TRUE(db::EntryDB(database).GetByHash(link["link"].asString(), entry));
  for (const char* file : {"", "-wal", "-shm"}) {
    ASSERT_EQ(remove((Path(kDatabase) + file).c_str()), 0) << file;
  }
  const Json::Value other = Make();
  EXPECT_FALSE(db::EntryDB(database).GetByHash(link["link"].asString(), entry));
  EXPECT_TRUE(db::EntryDB(database).GetByHash(other["link"].asString(), entry));
}

TEST_F(Records, ThatOthersHoldAreWaitedForTwoSecondsAtMost) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  const DatabaseProgram other(Path(kDatabase), "BEGIN IMMEDIATE");
  ASSERT_EQ(other.Error(), "");
  // Who only asks waits for nobody, and who is half over is extended another time.
  EXPECT_EQ(Ask(link, sid), 1);
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(Open(link), LINK_FAILED);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(8));
  EXPECT_EQ(SyslogCapture::Count("cannot open a sharing link [database is locked]"), 1);
}

}  // namespace
