#include <unistd.h>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"

namespace {

class Accounts : public PrivateRoot {
 protected:
  static int IsAdmin(const char* user) { return QLIBGroupIsAdminGroupMem(user, 0); }
};

TEST_F(Accounts, IdsAreTheRootsOwn) {
  uid_t uid = 0;
  gid_t gid = 0;
  EXPECT_EQ(QELOUserGetUGID("alice", &uid, &gid), 0);
  EXPECT_EQ(uid, IsRoot() ? 1002 : geteuid());
  EXPECT_EQ(gid, IsRoot() ? 1002 : getegid());
}

TEST_F(Accounts, IdsOfAnUnknownUserStayUnset) {
  uid_t uid = 7;
  gid_t gid = 8;
  EXPECT_NE(QELOUserGetUGID("zoe", &uid, &gid), 0);
  EXPECT_NE(QELOUserGetUGID("", &uid, &gid), 0);
  EXPECT_EQ(uid, 7U);
  EXPECT_EQ(gid, 8U);
}

TEST_F(Accounts, IdsAreNotToldWithoutAccountFile) {
  ASSERT_EQ(remove(Path("etc/passwd").c_str()), 0);
  uid_t uid = 0;
  gid_t gid = 0;
  EXPECT_NE(QELOUserGetUGID("alice", &uid, &gid), 0);
}

TEST_F(Accounts, LineOfAnyLengthIsRead) {
  const std::string longName(5000, 'x');
  Write("etc/passwd", "long:x:5:5:" + longName + ":/:/bin/sh\nlast:x:6:7::/:/bin/sh\n");
  uid_t uid = 0;
  gid_t gid = 0;
  EXPECT_EQ(QELOUserGetUGID("long", &uid, &gid), 0);
  EXPECT_EQ(uid, 5U);
  EXPECT_EQ(QELOUserGetUGID("last", &uid, &gid), 0);
  EXPECT_EQ(gid, 7U);
}

TEST_F(Accounts, BrokenLinesAreSkipped) {
  Write("etc/passwd", "nonsense\n:::\nbad:x:id:5::/:/bin/sh\nlast:x:6:7::/:/bin/sh\n");
  uid_t uid = 0;
  gid_t gid = 0;
  EXPECT_EQ(QELOUserGetUGID("last", &uid, &gid), 0);
  EXPECT_NE(QELOUserGetUGID("bad", &uid, &gid), 0);
  EXPECT_NE(QELOUserGetUGID("nonsense", &uid, &gid), 0);
}

TEST_F(Accounts, CommentsAndIndentedLinesAreRead) {
  Write("etc/passwd", "#alice:x:5:5::/:/bin/sh\n \tlast:x:6:7:::/bin/sh\n");
  uid_t uid = 0;
  gid_t gid = 0;
  EXPECT_NE(QELOUserGetUGID("alice", &uid, &gid), 0);
  EXPECT_NE(QELOUserGetUGID("#alice", &uid, &gid), 0);
  EXPECT_EQ(QELOUserGetUGID("last", &uid, &gid), 0);
  EXPECT_EQ(uid, 6U);
}

TEST_F(Accounts, FirstOfTwoLinesCounts) {
  Write("etc/passwd", "twice:x:6:7::/:/bin/sh\ntwice:x:8:9::/:/bin/sh\n");
  uid_t uid = 0;
  gid_t gid = 0;
  EXPECT_EQ(QELOUserGetUGID("twice", &uid, &gid), 0);
  EXPECT_EQ(uid, 6U);
}

TEST_F(Accounts, UserIdOfASessionIsTheUsers) {
  EXPECT_EQ(QeloCgiUIDGet("any", "alice"), IsRoot() ? 1002U : geteuid());
  EXPECT_EQ(QeloCgiUIDGet("any", "zoe"), 0xFFFFFFFFU);
  EXPECT_EQ(QeloCgiUIDGet("", ""), 0xFFFFFFFFU);
}

TEST_F(Accounts, AdministratorIsOfTheGroup) {
  EXPECT_EQ(IsAdmin("admin"), 1);
  EXPECT_EQ(IsAdmin("alice"), 0);
  EXPECT_EQ(IsAdmin("root"), 0);
  EXPECT_EQ(IsAdmin("zoe"), 0);
}

TEST_F(Accounts, PrimaryGroupMakesAnAdministratorToo) {
  Write("etc/passwd", "carol:x:6:1900::/:/bin/sh\n");
  Write("etc/group", "administrators:x:1900:\n");
  EXPECT_EQ(IsAdmin("carol"), 1);
}

TEST_F(Accounts, SettingNamesTheGroup) {
  Set({{"admin_group", "users"}});
  EXPECT_EQ(IsAdmin("alice"), 1);
  EXPECT_EQ(IsAdmin("admin"), 0);
}

TEST_F(Accounts, MissingGroupHasNoMembers) {
  Set({{"admin_group", "nobody-here"}});
  EXPECT_EQ(IsAdmin("admin"), 0);
}

TEST_F(Accounts, AdministratorCannotBeToldWithoutTheFiles) {
  ASSERT_EQ(remove(Path("etc/group").c_str()), 0);
  EXPECT_EQ(IsAdmin("admin"), -1);
  ASSERT_EQ(remove(Path("etc/passwd").c_str()), 0);
  EXPECT_EQ(IsAdmin("admin"), -1);
}

TEST_F(Accounts, GroupWithManyMembersIsReadWhole) {
  std::string members;
  for (int i = 0; i < 2000; ++i) {
    members += "user" + std::to_string(i) + ",";
  }
  Write("etc/group", "administrators:x:1900:" + members + "alice\n");
  EXPECT_EQ(IsAdmin("alice"), 1);
  EXPECT_EQ(IsAdmin("bob"), 0);
}

}  // namespace
