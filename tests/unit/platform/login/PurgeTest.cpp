// What a login does for a store of many sessions.

#include <filesystem>
#include <fstream>

#include "platform/base/PrivateDir.h"
#include "tests/unit/platform/login/SessionFixture.h"

namespace {

using QELO::Platform::PurgeShare;

constexpr int kMany = 2 * PurgeShare::kMost + 1000;
constexpr long kLongAgo = 9000 + 10;  // seconds: ten time-outs

class Purge : public SessionFixture {
 protected:
  static constexpr char kStore[] = "run/webapi/sessions";

  /// Gives the store so many files that no session has, in use until they are aged.
  static void AddFiles(int count) {
    for (int i = 0; i < count; ++i) {
      std::ofstream(Path(std::string(kStore) + "/file" + std::to_string(i)));
    }
  }
  static void AgeAll() {
    for (const auto& file : std::filesystem::directory_iterator(Path(kStore))) {
      if (file.is_regular_file() && file.path().filename() != ".purged") {
        Age(std::string(kStore) + "/" + file.path().filename().string(), kLongAgo);
      }
    }
  }
};

TEST_F(Purge, OfAFewLooksAtAll) {
  Set({{"session_purge_pause", "0"}});
  Create();
  AddFiles(100);
  AgeAll();
  Create();
  EXPECT_EQ(CountFiles(kStore), 1);
}

TEST_F(Purge, OfManyLooksAtAShareThatIsDrawnAnew) {
  Set({{"session_purge_pause", "0"}});
  Create();
  AddFiles(kMany);
  Create();  // sees how many there are
  AgeAll();
  Create();
  const int left = CountFiles(kStore);
  EXPECT_GT(left, kMany / 2);
  EXPECT_LT(left, kMany - static_cast<int>(PurgeShare::kMost) / 2);
  for (int login = 0; login < 100 && CountFiles(kStore) > 200; ++login) {
    Create();
  }
  EXPECT_LE(CountFiles(kStore), 200);  // those of these logins
}

}  // namespace
