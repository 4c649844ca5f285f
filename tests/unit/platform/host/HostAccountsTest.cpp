#include <grp.h>
#include <gtest/gtest.h>
#include <pwd.h>
#include <unistd.h>

#include <algorithm>

#include "platform/accounts/Accounts.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {
namespace {

TEST(HostAccounts, EveryUserOfTheHostIsFound) {
  int count = 0;
  setpwent();
  while (const passwd* entry = getpwent()) {
    Account account;
    ASSERT_EQ(findAccount(entry->pw_name, account), Lookup::kFound) << entry->pw_name;
    EXPECT_EQ(account.name, entry->pw_name);
    EXPECT_EQ(account.home, entry->pw_dir);
    ASSERT_EQ(findAccountById(entry->pw_uid, account), Lookup::kFound) << entry->pw_uid;
    EXPECT_EQ(account.uid, entry->pw_uid);
    ++count;
  }
  endpwent();
  EXPECT_GT(count, 0);
}

TEST(HostAccounts, RootHasItsIds) {
  uid_t uid = 7;
  gid_t gid = 7;
  EXPECT_EQ(QELOUserGetUGID("root", &uid, &gid), 0);
  EXPECT_EQ(uid, 0U);
  EXPECT_EQ(gid, 0U);
}

TEST(HostAccounts, UnknownNamesAreAbsent) {
  Account account;
  gid_t gid = 7;
  EXPECT_EQ(findAccount("nobody-of-this-name", account), Lookup::kAbsent);
  EXPECT_EQ(findAccount("", account), Lookup::kAbsent);
  EXPECT_EQ(findAccountById(4123456789, account), Lookup::kAbsent);
  EXPECT_EQ(findGroup("no-group-of-this-name", gid), Lookup::kAbsent);
  EXPECT_EQ(gid, 7U);
}

TEST(HostAccounts, GroupsAreThePrimaryAndThoseThatNameTheUser) {
  int memberships = 0;
  setgrent();
  while (const group* entry = getgrent()) {
    gid_t gid = 0;
    EXPECT_EQ(findGroup(entry->gr_name, gid), Lookup::kFound) << entry->gr_name;
    for (char** member = entry->gr_mem; *member != nullptr; ++member) {
      Account account;
      std::vector<gid_t> groups;
      if (findAccount(*member, account) == Lookup::kFound) {
        ASSERT_EQ(findGroupsOf(account, groups), Lookup::kFound);
        EXPECT_NE(std::find(groups.begin(), groups.end(), account.gid), groups.end());
        EXPECT_NE(std::find(groups.begin(), groups.end(), gid), groups.end());
        ++memberships;
      }
    }
  }
  endgrent();
  Account root;
  std::vector<gid_t> groups;
  ASSERT_EQ(findAccount("root", root), Lookup::kFound);
  ASSERT_EQ(findGroupsOf(root, groups), Lookup::kFound);
  EXPECT_NE(std::find(groups.begin(), groups.end(), 0U), groups.end());
  RecordProperty("memberships", memberships);
}

TEST(HostAccounts, ShadowEntriesAreThoseOfTheHost) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "root alone reads them";
  }
  int count = 0;
  setspent();
  while (const spwd* entry = getspent()) {
    ShadowEntry found;
    ASSERT_EQ(findShadow(entry->sp_namp, found), Lookup::kFound) << entry->sp_namp;
    EXPECT_EQ(found.hash, entry->sp_pwdp);
    EXPECT_EQ(found.expiry, entry->sp_expire);
    ++count;
  }
  endspent();
  EXPECT_GT(count, 0);
  ShadowEntry none;
  EXPECT_EQ(findShadow("nobody-of-this-name", none), Lookup::kAbsent);
}

TEST(HostAccounts, ShadowEntriesAreNotKnownToOrdinaryUsers) {
  const auto ask = [] {
    ShadowEntry entry;
    const bool dropped = geteuid() != 0 || setresuid(65534, 65534, 65534) == 0;
    _exit(dropped && findShadow("daemon", entry) == Lookup::kFailed &&
                  findShadow("nobody-of-this-name", entry) == Lookup::kFailed
              ? 0
              : 1);
  };
  EXPECT_EXIT(ask(), testing::ExitedWithCode(0), "");
}

TEST(HostAccounts, AccountsWithoutShellAreBarred) {
  Account account;
  account.name = "anna";
  for (const char* shell : {"/usr/sbin/nologin", "/sbin/nologin", "/bin/false", "nologin"}) {
    account.shell = shell;
    EXPECT_TRUE(isBarredFromLogin(account)) << shell;
  }
  for (const char* shell : {"/bin/sh", "", "/bin/nologins", "/bin/true"}) {
    account.shell = shell;
    EXPECT_FALSE(isBarredFromLogin(account)) << shell;
  }
  account.name = "system";
  EXPECT_TRUE(isBarredFromLogin(account));
}

}  // namespace
}  // namespace QELO::Platform
