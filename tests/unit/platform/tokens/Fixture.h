#pragma once

#include <unistd.h>

#include <string>

#include "platform/tokens/module/TokenStore.h"
#include "tests/unit/platform/DatabaseProgram.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Token.h"

/// A private root whose token database tests fill and look into.
class TokenTest : public PrivateRoot {
 protected:
  using TokenStore = QELO::Platform::TokenStore;

  static std::string Database() { return Path("var/lib/webapi/tokens.db"); }

  /// The id that the script gives an account.
  static uid_t UidOf(const std::string& user) {
    return !IsRoot() ? geteuid() : user == "alice" ? 1002 : user == "bob" ? 1003 : 7000;
  }

  static std::string CreateForService(const std::string& user) {
    return Create(user, "*", "*", 0, nullptr, true);
  }

  static std::string Create(const std::string& user = "alice", const std::string& api = "*",
                            const std::string& method = "*", int64_t expires = 0,
                            int64_t* id = nullptr, bool isService = false) {
    TokenStore store;
    TokenStore::Entry entry;
    entry.owner = {user, user == "system" && IsRoot() ? 900 : UidOf(user), isService};
    entry.scopes = {{api, method}};
    entry.expires = expires;
    std::string token;
    EXPECT_TRUE(store.Open(Database().c_str(), true, NoUid)) << store.Error();
    EXPECT_TRUE(store.Create(entry, token)) << store.Error();
    if (id != nullptr) {
      *id = entry.id;
    }
    return token;
  }

  /// A token of alice's for all calls, as `change` makes it.
  template <typename Change>
  static std::string CreateWith(Change change) {
    TokenStore store;
    TokenStore::Entry entry;
    entry.owner = {"alice", UidOf("alice"), false};
    entry.scopes = {{"*", "*"}};
    change(entry);
    std::string token;
    EXPECT_TRUE(store.Open(Database().c_str(), true, NoUid)) << store.Error();
    EXPECT_TRUE(store.Create(entry, token)) << store.Error();
    return token;
  }

  static uid_t NoUid(const char*) { return TokenStore::kNobody; }

  /// Runs SQL in the database as another program would.
  static void Execute(const std::string& sql) { EXPECT_EQ(runSql(Database(), sql), ""); }

  /// Takes the database back to its second version, which kept one API and method of a token.
  static void MakeSecond() {
    Execute(
        "ALTER TABLE tokens ADD COLUMN api TEXT NOT NULL DEFAULT '';"
        "ALTER TABLE tokens ADD COLUMN method TEXT NOT NULL DEFAULT '';"
        "UPDATE tokens SET (api, method) = (SELECT api, method FROM scopes WHERE token = id);"
        "DROP TABLE scopes; ALTER TABLE tokens DROP COLUMN name;"
        "ALTER TABLE tokens DROP COLUMN readonly; ALTER TABLE tokens DROP COLUMN address;"
        "ALTER TABLE tokens DROP COLUMN used; PRAGMA user_version=1");
  }

  /// Takes the database back to its first version, which kept no ids of users.
  static void MakeOld() {
    MakeSecond();
    Execute(
        "ALTER TABLE tokens DROP COLUMN uid; ALTER TABLE tokens DROP COLUMN service;"
        "PRAGMA user_version=0");
  }

  int Grant(const std::string& token, const char* api = "QELO.X", const char* method = "get",
            int size = 64) {
    user_[0] = 'x';
    user_[1] = '\0';
    const int result = QeloAccessTokenGrant(token.c_str(), api, method, user_, size);
    EXPECT_EQ(result >= 0, user_[0] != '\0') << user_;
    return result;
  }

  char user_[64] = "";
};
