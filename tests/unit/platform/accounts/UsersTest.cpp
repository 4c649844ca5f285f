#include <unistd.h>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

using Users = PrivateRoot;

/// The name of the user with this id; "" when there is none.
std::string NameOf(uid_t uid) {
  QeloUser* user = nullptr;
  const int result = QELOUserGetByUID(uid, &user);
  EXPECT_EQ(result == 0, user != nullptr);
  const std::string name = user != nullptr && user->uid == uid ? user->name : "";
  QELOUserFree(user);
  return name;
}

TEST_F(Users, AreFoundById) {
  Write("etc/passwd", "ann:x:5001:5002:Ann:/:/bin/sh\nbob:x:5003:5004::/:/bin/sh\n");
  EXPECT_EQ(NameOf(5001), "ann");
  EXPECT_EQ(NameOf(5003), "bob");
  QeloUser* user = nullptr;
  ASSERT_EQ(QELOUserGetByUID(5003, &user), 0);
  EXPECT_EQ(user->gid, 5004U);
  QELOUserFree(user);
}

TEST_F(Users, FirstOfOneIdCounts) {
  Write("etc/passwd", "ann:x:5001:1::/:/bin/sh\nbob:x:5001:1::/:/bin/sh\n");
  EXPECT_EQ(NameOf(5001), "ann");
}

TEST_F(Users, UnknownIdsAndBrokenLinesHaveNone) {
  Write("etc/passwd", "ann:x:5001x:1::/:/bin/sh\n:x:5001:1::/:/bin/sh\n");
  EXPECT_EQ(NameOf(5001), "");
  EXPECT_EQ(NameOf(static_cast<uid_t>(-1)), "");
  ASSERT_EQ(remove(Path("etc/passwd").c_str()), 0);
  EXPECT_EQ(NameOf(0), "");
}

}  // namespace
