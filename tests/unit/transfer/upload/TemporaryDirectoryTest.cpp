// Where the temporary files of an upload go.

#include "webapi/transfer/upload/TemporaryDirectory.h"

#include <filesystem>

#include "tests/unit/transfer/upload/Fixture.h"

namespace QELO {
namespace {

class TemporaryDirectory : public UploadTest {
 protected:
  std::string Choose(unsigned long long size) {
    std::string directory = "(none)";
    ChooseTemporaryDirectory(size, directory);
    return directory;
  }
};

TEST_F(TemporaryDirectory, VolumeWithRoomComesFirst) {
  const std::string volume = testing::TempDir() + "volume";
  fake.volume = volume;
  EXPECT_EQ(Choose(77), volume + "/@tmp");
  EXPECT_EQ(fake.wanted, 77U);
  EXPECT_EQ(platform.calls.back(),
            "QELOFSMkdirP(" + volume + "/@tmp, 1, 0, -1, -1, " + std::to_string(01777) + ")");
  EXPECT_EQ(fake.error, 0);
  std::filesystem::remove_all(volume);
}

TEST_F(TemporaryDirectory, VolumesDirectoryThatCannotBeMadeIsChosenAllTheSame) {
  fake.volume = "/volume1";
  platform.mkdirResult = -1;
  EXPECT_EQ(Choose(77), "/volume1/@tmp");
}

TEST_F(TemporaryDirectory, TinyModelTriesNoVolume) {
  fake.volume = "/volume1";
  platform.settings["tinyunit"] = "yes";
  EXPECT_EQ(Choose(77), Paths::kTmp);
  EXPECT_EQ(CountCalls("VolumeAvailGet"), 0);
  EXPECT_EQ(fake.error, 0);
  EXPECT_EQ(platform.calls.front(),
            std::string("QLIBCFileCheckKeyValue(") + Paths::kSystemInfoDefaults + ", tinyunit)");
}

TEST_F(TemporaryDirectory, NoVolumeWithRoomSetsAnErrorAndTmpIsTried) {
  EXPECT_EQ(Choose(77), Paths::kTmp);
  EXPECT_EQ(platform.calls.back(), "QLIBCErrSetEx(10496, APIUpload.cpp)");
}

TEST_F(TemporaryDirectory, TmpWithExactlyTheSizeIsChosen) {
  host.freeBytes[Paths::kTmp] = 5000;
  EXPECT_EQ(Choose(5000), Paths::kTmp);
  EXPECT_EQ(CountCalls("QLIBCErrSetEx"), 1);  // the volume's
}

TEST_F(TemporaryDirectory, OneByteLessFallsThroughToVarTmp) {
  host.freeBytes[Paths::kTmp] = 4999;
  EXPECT_EQ(Choose(5000), Paths::kVarTmp);
  EXPECT_EQ(CountCalls("QLIBCErrSetEx"), 2);
  EXPECT_EQ(platform.calls.back(), std::string("QELOFSMkdirP(") + Paths::kVarTmp +
                                       ", 1, 0, -1, -1, " + std::to_string(0700) + ")");
}

TEST_F(TemporaryDirectory, TmpThatCannotBeAskedHasNoRoom) {
  host.freeBytes.erase(Paths::kTmp);
  EXPECT_EQ(Choose(5000), Paths::kVarTmp);
}

TEST_F(TemporaryDirectory, VarTmpLeavesTheSystem200MiB) {
  host.freeBytes[Paths::kTmp] = 0;
  host.freeBytes[Paths::kRoot] = 5000 + kReserve;
  EXPECT_EQ(Choose(5000), Paths::kVarTmp);
  EXPECT_EQ(Choose(5001), "(none)");
  EXPECT_EQ(fake.error, 10496);
  EXPECT_EQ(platform.calls.back(), "QLIBCErrSetEx(10496, APIUpload.cpp)");
}

TEST_F(TemporaryDirectory, VarTmpThatCannotBeMadeIsNone) {
  host.freeBytes[Paths::kTmp] = 0;
  platform.mkdirResult = -1;
  EXPECT_EQ(Choose(5000), "(none)");
  EXPECT_EQ(fake.error, 3072);
}

}  // namespace
}  // namespace QELO
