// Whose word the settings are.

#include <filesystem>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

namespace fs = std::filesystem;

constexpr char kFile[] = "etc/qeloinfo.conf";
constexpr char kDefaults[] = "etc.defaults/qeloinfo.conf";
constexpr char kRefused[] = "qeloinfo.conf: others may write it or its directory";

class SettingsFile : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    Write(kDefaults, "session_timeout=200\n", 0644);
    Write(kFile, "session_timeout=100\n", 0644);
  }
  static void MakeWritable(const char* relative) {
    fs::permissions(Path(relative), fs::perms::group_write, fs::perm_options::add);
  }
};

TEST_F(SettingsFile, OfTheAdministratorAloneCounts) {
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 100);
  EXPECT_EQ(SyslogCapture::Count("others may write"), 0);
}

TEST_F(SettingsFile, ThatOthersMayWriteDoesNotCountAndIsLoggedOnce) {
  MakeWritable(kFile);
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 200);
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 200);
  EXPECT_EQ(SyslogCapture::Count(kRefused), 1);
  MakeWritable(kDefaults);
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 900);
  EXPECT_EQ(SyslogCapture::Count(kRefused), 2);
}

TEST_F(SettingsFile, InADirectoryThatOthersMayWriteDoesNotCount) {
  MakeWritable("etc");
  EXPECT_EQ(QLIBCConfGetARDOTimeout(), 200);
}

TEST_F(SettingsFile, ThatOthersMayWriteIsNotMadeTrustedByAChange) {
  MakeWritable(kFile);
  EXPECT_NE(QLIBCINFOSetKeyValue("a", "1"), 0);
  EXPECT_EQ(Read(kFile), "session_timeout=100\n");
  EXPECT_GE(SyslogCapture::Count(kRefused), 1);
}

}  // namespace
