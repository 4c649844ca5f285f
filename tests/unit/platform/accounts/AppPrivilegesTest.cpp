#include <filesystem>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

class AppPrivileges : public PrivateRoot {
 protected:
  static void Rules(const std::string& text) { Write("etc/webapi/appprivs.json", text); }
  static bool Has(const char* user, const char* address = kAddress) {
    return QLIBAppPrivUserHas(user, "QELO.App", address) != 0;
  }
};

TEST_F(AppPrivileges, WithoutFileAdministratorsAloneHaveThem) {
  EXPECT_TRUE(Has("admin"));
  EXPECT_FALSE(Has("alice"));
  EXPECT_FALSE(Has("zoe"));
}

TEST_F(AppPrivileges, ApplicationWithoutEntryIsForAdministratorsAlone) {
  Rules(R"({"QELO.Other": {"allow": [{"everyone": true}]}})");
  EXPECT_TRUE(Has("admin"));
  EXPECT_FALSE(Has("alice"));
}

TEST_F(AppPrivileges, UserIsAllowedByName) {
  Rules(R"({"QELO.App": {"allow": [{"user": "alice"}]}})");
  EXPECT_TRUE(Has("alice"));
  EXPECT_FALSE(Has("bob"));
  EXPECT_TRUE(Has("admin"));
}

TEST_F(AppPrivileges, FileThatOthersMayWriteGivesNobodyTheRight) {
  const char* file = "etc/webapi/appprivs.json";
  const std::string rules = R"({"QELO.App": {"allow": [{"user": "alice"}]}})";
  for (const mode_t mode : {0664, 0646}) {
    Write(file, rules, mode);
    SyslogCapture::Clear();
    EXPECT_FALSE(Has("alice")) << mode;
    EXPECT_FALSE(Has("admin")) << mode;
    EXPECT_EQ(SyslogCapture::Count("appprivs.json: others may write it or its directory"), 2);
  }
  Write(file, rules, 0644);
  EXPECT_TRUE(Has("alice"));
  std::filesystem::permissions(Path("etc/webapi"), std::filesystem::perms::group_write,
                               std::filesystem::perm_options::add);
  EXPECT_FALSE(Has("alice"));
}

TEST_F(AppPrivileges, UserIsAllowedByGroup) {
  Rules(R"({"QELO.App": {"allow": [{"group": "users"}]}})");
  EXPECT_TRUE(Has("alice"));
  EXPECT_TRUE(Has("bob"));
  Rules(R"({"QELO.App": {"allow": [{"group": "nobody-here"}]}})");
  EXPECT_FALSE(Has("alice"));
}

TEST_F(AppPrivileges, UserIsAllowedByPrimaryGroup) {
  Write("etc/passwd", "carol:x:7:1950::/:/bin/sh\n");
  Write("etc/group", "staff:x:1950:\nadministrators:x:1100:\n");
  Rules(R"({"QELO.App": {"allow": [{"group": "staff"}]}})");
  EXPECT_TRUE(Has("carol"));
}

TEST_F(AppPrivileges, UserIsAllowedByAddress) {
  Rules(R"({"QELO.App": {"allow": [{"address": "192.0.2.0/24"}, {"address": "2001:db8::/32"}]}})");
  EXPECT_TRUE(Has("alice", "192.0.2.1"));
  EXPECT_TRUE(Has("alice", "::ffff:192.0.2.1"));
  EXPECT_TRUE(Has("alice", "2001:db8:9::1"));
  EXPECT_FALSE(Has("alice", "192.0.3.1"));
  EXPECT_FALSE(Has("alice", "2001:db9::1"));
  EXPECT_FALSE(Has("alice", ""));
  EXPECT_FALSE(Has("alice", nullptr));
}

TEST_F(AppPrivileges, NetworksHoldTheirAddressesAlone) {
  const auto holds = [](const std::string& network, const char* address) {
    Rules(R"({"QELO.App": {"allow": [{"address": ")" + network + "\"}]}}");
    return Has("alice", address);
  };
  EXPECT_TRUE(holds("192.0.2.7", "192.0.2.7"));
  EXPECT_FALSE(holds("192.0.2.7", "192.0.2.6"));
  EXPECT_TRUE(holds("192.0.2.8/30", "192.0.2.11"));
  EXPECT_FALSE(holds("192.0.2.8/30", "192.0.2.12"));
  EXPECT_TRUE(holds("0.0.0.0/0", "203.0.113.1"));
  EXPECT_FALSE(holds("0.0.0.0/0", "2001:db8::1"));
  EXPECT_TRUE(holds("::/0", "2001:db8::1"));
  EXPECT_FALSE(holds("::/0", "203.0.113.1"));
  EXPECT_TRUE(holds("2001:db8::1/128", "2001:db8::1"));
  EXPECT_FALSE(holds("192.0.2.0/33", "192.0.2.1"));
  EXPECT_FALSE(holds("192.0.2.0/-1", "192.0.2.1"));
  EXPECT_FALSE(holds("192.0.2.0/", "192.0.2.1"));
  EXPECT_FALSE(holds("192.0.2.0/24x", "192.0.2.1"));
  EXPECT_FALSE(holds("", "192.0.2.1"));
}

TEST_F(AppPrivileges, EveryoneIsAllowedWhenTheRuleSaysTrue) {
  Rules(R"({"QELO.App": {"allow": [{"everyone": true}]}})");
  EXPECT_TRUE(Has("alice"));
  EXPECT_FALSE(Has("zoe"));
  Rules(R"({"QELO.App": {"allow": [{"everyone": false}]}})");
  EXPECT_FALSE(Has("alice"));
}

TEST_F(AppPrivileges, RuleWithSeveralKeysNeedsAll) {
  Rules(R"({"QELO.App": {"allow": [{"user": "alice", "address": "192.0.2.0/24"}]}})");
  EXPECT_TRUE(Has("alice", "192.0.2.1"));
  EXPECT_FALSE(Has("alice", "192.0.3.1"));
  EXPECT_FALSE(Has("bob", "192.0.2.1"));
}

TEST_F(AppPrivileges, DenyWinsOverAllow) {
  Rules(R"({"QELO.App": {"allow": [{"everyone": true}], "deny": [{"user": "alice"}]}})");
  EXPECT_FALSE(Has("alice"));
  EXPECT_TRUE(Has("bob"));
}

TEST_F(AppPrivileges, DenyWinsOverBeingAnAdministrator) {
  Rules(R"({"QELO.App": {"deny": [{"group": "administrators"}]}})");
  EXPECT_FALSE(Has("admin"));
}

TEST_F(AppPrivileges, DenyByAddressHoldsForAnUnknownAddress) {
  Rules(R"({"QELO.App": {"allow": [{"everyone": true}], "deny": [{"address": "10.0.0.0/8"}]}})");
  EXPECT_TRUE(Has("alice", "192.0.2.1"));
  EXPECT_FALSE(Has("alice", "10.1.1.1"));
  EXPECT_FALSE(Has("alice", ""));
}

TEST_F(AppPrivileges, MalformedRuleAllowsNothing) {
  for (const char* rule : {"{}", "[]", "\"alice\"", "1", "null", R"({"user": ["alice"]})",
                           R"({"usr": "alice"})", R"({"user": "alice", "when": "now"})",
                           R"({"everyone": "true"})", R"({"address": "nonsense"})"}) {
    Rules(std::string(R"({"QELO.App": {"allow": [)") + rule + "]}}");
    EXPECT_FALSE(Has("alice")) << rule;
    EXPECT_TRUE(Has("admin")) << rule;
  }
  Rules(R"({"QELO.App": {"allow": {"user": "alice"}}})");
  EXPECT_FALSE(Has("alice"));
}

TEST_F(AppPrivileges, MalformedDenyRuleDeniesEverybody) {
  for (const char* rule : {"{}", "\"bob\"", R"({"usr": "bob"})", R"({"address": "nonsense"})"}) {
    Rules(std::string(R"({"QELO.App": {"allow": [{"everyone": true}], "deny": [)") + rule + "]}}");
    EXPECT_FALSE(Has("alice")) << rule;
    EXPECT_FALSE(Has("admin")) << rule;
  }
  Rules(R"({"QELO.App": {"allow": [{"everyone": true}], "deny": {"user": "bob"}}})");
  EXPECT_FALSE(Has("alice"));
}

TEST_F(AppPrivileges, MalformedDenyRuleThatCannotMeetTheUserDeniesNothing) {
  Rules(R"({"QELO.App": {"allow": [{"everyone": true}],
            "deny": [{"user": "bob", "addres": "10.0.0.1"}]}})");
  EXPECT_TRUE(Has("alice"));
  EXPECT_FALSE(Has("bob"));
}

TEST_F(AppPrivileges, FileThatCannotBeUnderstoodGivesThemToNobody) {
  int expected = 0;
  for (const char* text : {"", "{", "[]", "\"x\"", R"({"QELO.App": []})", R"({"QELO.App": "x"})",
                           R"({"QELO.App": {"denied": [{"user": "alice"}]}})"}) {
    Rules(text);
    EXPECT_FALSE(Has("admin")) << text;
    ++expected;
    EXPECT_EQ(SyslogCapture::Count(Path("etc/webapi/appprivs.json") +
                                   ": no rules can be read for QELO.App"),
              expected);
  }
}

TEST_F(AppPrivileges, UnreadableAccountsGiveThemToNobody) {
  Rules(R"({"QELO.App": {"allow": [{"everyone": true}]}})");
  ASSERT_EQ(remove(Path("etc/group").c_str()), 0);
  EXPECT_FALSE(Has("admin"));
  EXPECT_FALSE(Has("alice"));
}

}  // namespace
