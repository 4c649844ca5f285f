// Volumes for uploads, and the last error.

#include <filesystem>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

class Volumes : public PrivateRoot {
 protected:
  std::string Avail(unsigned long long size) const {
    QELOVolumeRecord volume{};
    return VolumeAvailGet(size, &volume) == 1 ? volume.path : "(none)";
  }
};

TEST_F(Volumes, AreTheSettings) {
  EXPECT_EQ(Avail(1), "(none)");
  std::filesystem::create_directory(Path("volume1"));
  std::filesystem::create_directory(Path("volume2"));
  Set({{"volumes", "/missing, relative  /volume1 /volume2"}});
  EXPECT_EQ(Avail(1), Path("volume1"));
}

TEST_F(Volumes, NeedRoom) {
  std::filesystem::create_directory(Path("volume1"));
  Set({{"volumes", "/volume1"}});
  EXPECT_EQ(Avail(1ULL << 62), "(none)");
}

TEST_F(Volumes, OfPathsBeyondTheRecordAreNone) {
  Set({{"volumes", "/" + std::string(2000, 'v')}});
  EXPECT_EQ(Avail(1), "(none)");
}

TEST(LastError, IsTheOneThatWasSet) {
  QLIBCErrSetEx(77, "A.cpp", 1);
  EXPECT_EQ(QLIBCErrGet(), 77);
  QLIBCErrSetEx(0, "A.cpp", 2);
  EXPECT_EQ(QLIBCErrGet(), 0);
}

}  // namespace
