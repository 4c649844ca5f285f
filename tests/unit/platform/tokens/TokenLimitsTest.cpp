// What a token is for, from where, and when it was used.

#include <chrono>

#include "tests/unit/platform/DatabaseProgram.h"
#include "tests/unit/platform/tokens/Fixture.h"

namespace {

using TokenLimits = TokenTest;

TEST_F(TokenLimits, ScopesAreNamesOrTheirBeginnings) {
  const std::string token = CreateWith([](TokenStore::Entry& entry) {
    entry.scopes = {{"QELO.Host.*", "get*"}, {"QELO.X", "set"}, {"QELO.X", "list"}};
  });
  EXPECT_EQ(Grant(token, "QELO.Host.Info", "get"), 1);
  EXPECT_EQ(Grant(token, "QELO.Host.", "get_all"), 1);
  EXPECT_EQ(Grant(token, "QELO.Host", "get"), -3);
  EXPECT_EQ(Grant(token, "QELO.Host.Info", "set"), -3);
  EXPECT_EQ(Grant(token, "QELO.X", "set"), 1);
  EXPECT_EQ(Grant(token, "QELO.X", "list"), 1);
  EXPECT_EQ(Grant(token, "QELO.X", "get"), -3);
  EXPECT_EQ(Grant(CreateWith([](TokenStore::Entry& entry) { entry.scopes.clear(); })), -3);
}

TEST_F(TokenLimits, AddressIsAskedWhereATokenHasOne) {
  const auto from = [this](const std::string& token, const char* address) {
    setenv("REMOTE_ADDR", address, 1);
    return Grant(token);
  };
  const std::string token =
      CreateWith([](TokenStore::Entry& entry) { entry.address = "192.0.2.0/24"; });
  EXPECT_EQ(from(token, "192.0.2.200"), 1);
  EXPECT_EQ(from(token, "192.0.3.1"), -3);
  EXPECT_EQ(from(token, "2001:db8::1"), -3);
  EXPECT_EQ(from(token, ""), -3);
  EXPECT_EQ(from(Create(), ""), 1);
  EXPECT_EQ(
      from(CreateWith([](TokenStore::Entry& entry) { entry.address = "nonsense"; }), "192.0.2.1"),
      -3);
}

TEST_F(TokenLimits, ReadOnlyTokenIsForMethodsThatSayTheyChangeNothing) {
  Write("usr/qelo/qeloman/webapi/QELO.X.lib",
        R"({"QELO.X": {"methods": {
              "1": [{"get": {"readOnly": true}}, {"odd": {"readOnly": true}}, "plain",
                    {"text": {"readOnly": "true"}}, {"none": {}}],
              "2": [{"get": {"readOnly": true}}, "odd", 5]}}})",
        0644);
  const std::string token = CreateWith([](TokenStore::Entry& entry) { entry.readOnly = true; });
  EXPECT_EQ(Grant(token, "QELO.X", "get"), 1);
  for (const char* method : {"odd", "plain", "text", "none", "missing", ""}) {
    EXPECT_EQ(Grant(token, "QELO.X", method), -3) << method;
  }
  EXPECT_EQ(Grant(token, "QELO.Y", "get"), -3);
  EXPECT_EQ(Grant(token, "", "get"), -3);
  ASSERT_EQ(chmod(Path("usr/qelo/qeloman/webapi/QELO.X.lib").c_str(), 0666), 0);
  EXPECT_EQ(Grant(token, "QELO.X", "get"), -3);
}

TEST_F(TokenLimits, LastUseIsKeptByTheMinute) {
  const std::string token = Create();
  const auto used = [] {
    TokenStore store;
    std::vector<TokenStore::Entry> entries;
    EXPECT_TRUE(store.Open(Database().c_str(), false, NoUid));
    EXPECT_TRUE(store.List(nullptr, entries));
    return entries.at(0).used;
  };
  EXPECT_EQ(used(), 0);
  EXPECT_EQ(Grant(token, "QELO.X", "get", 2), -3);  // refused
  EXPECT_EQ(used(), 0);
  EXPECT_EQ(Grant(token), 1);
  EXPECT_NEAR(static_cast<double>(used()), static_cast<double>(time(nullptr)), 5);
  Execute("UPDATE tokens SET used = used - 30");
  const int64_t before = used();
  EXPECT_EQ(Grant(token), 1);
  EXPECT_EQ(used(), before);
  Execute("UPDATE tokens SET used = used - 60");
  EXPECT_EQ(Grant(token), 1);
  EXPECT_GT(used(), before);
}

TEST_F(TokenLimits, LastUseIsLeftOutWhileSomebodyElseWrites) {
  const std::string token = Create();
  const DatabaseProgram other(Database(), "BEGIN IMMEDIATE");
  ASSERT_EQ(other.Error(), "");
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(Grant(token), 1);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(1500));
}

}  // namespace
