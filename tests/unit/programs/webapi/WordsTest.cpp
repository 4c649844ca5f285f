#include "programs/webapi/check/Words.h"

#include <gtest/gtest.h>

namespace QELO::AuthorProgram {
namespace {

TEST(Words, DistanceCountsWhatMustBeChanged) {
  EXPECT_EQ(Distance("grantByUser", "grantByUser", 2), 0U);
  EXPECT_EQ(Distance("grantByUsr", "grantByUser", 2), 1U);
  EXPECT_EQ(Distance("grantByUsers", "grantByUser", 2), 1U);
  EXPECT_EQ(Distance("grantByUsre", "grantByUser", 2), 1U) << "two letters exchanged";
  EXPECT_EQ(Distance("GRANTBYUSER", "grantByUser", 2), 0U);
  EXPECT_EQ(Distance("", "ab", 2), 2U);
  EXPECT_EQ(Distance("colour", "grantByUser", 2), 3U) << "more than asked for";
  EXPECT_EQ(Distance(std::string(100000, 'a'), "a", 2), 3U);
}

TEST(Words, NearestOfTheKnownIsMeant_WhenItIsNearEnough) {
  const std::vector<std::string_view> known = {"lib", "runAs", "minVersion", "maxVersion"};
  EXPECT_EQ(Resembling("mxVersion", known), "maxVersion");
  EXPECT_EQ(Resembling("run_as", known), "runAs");
  EXPECT_EQ(Resembling("libs", known), "lib");
  EXPECT_EQ(Resembling("link", known), "") << "a short word may be wrong in one letter";
  EXPECT_EQ(Suggestion("rnuAs", known), "; did you mean \"runAs\"?");
  EXPECT_EQ(Suggestion("shares", known), "");
}

}  // namespace
}  // namespace QELO::AuthorProgram
