#include "paths/Listing.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <chrono>

#include "SharedFolder.h"

using namespace files;

namespace {

class ListingTest : public SharedFolder {
 protected:
  ListingTest() { wish_.limit = Listing::kMostItems; }

  /// The names of the page, each with a blank behind it.
  std::string Names() {
    std::vector<Item> items;
    EXPECT_EQ(Listing::Read(folder_, wish_, items, total_), Reason::kNone);
    std::string names;
    for (const Item& item : items) {
      names += item.name + " ";
    }
    return names;
  }

  Listing::Wish wish_;
  uint64_t total_ = 0;
};

}  // namespace

TEST_F(ListingTest, IsSortedByNameWhateverTheCase) {
  for (const char* name : {"b", "C", "a", "B", ".hidden"}) {
    Write(Path(name), "");
  }
  EXPECT_EQ(Names(), ".hidden a B b C ");
  EXPECT_EQ(total_, 5U);
  wish_.descending = true;
  EXPECT_EQ(Names(), "C b B a .hidden ");
}

TEST_F(ListingTest, IsSortedBySizeTimeAndType) {
  Write(Path("x"), "22");
  Write(Path("y"), "1");
  Write(Path("z"), "333");
  MakeFolder("d");
  const timespec times[][2] = {{{0, 0}, {300, 0}}, {{0, 0}, {200, 5}}, {{0, 0}, {200, 4}}};
  const char* names[] = {"x", "y", "z"};
  for (int i = 0; i < 3; ++i) {
    ASSERT_EQ(utimensat(AT_FDCWD, Path(names[i]).c_str(), times[i], 0), 0);
  }
  wish_.order = Listing::Order::kSize;
  EXPECT_EQ(Names(), "d y x z ");
  wish_.order = Listing::Order::kTime;
  EXPECT_EQ(Names(), "z y x d ");
  wish_.order = Listing::Order::kType;
  EXPECT_EQ(Names(), "x y z d ");
  wish_.descending = true;
  EXPECT_EQ(Names(), "d z y x ");
}

TEST_F(ListingTest, PagesFollowEachOther) {
  for (int i = 0; i < 10; ++i) {
    Write(Path(std::string(1, static_cast<char>('a' + i))), "");
  }
  wish_.limit = 4;
  EXPECT_EQ(Names(), "a b c d ");
  EXPECT_EQ(total_, 10U);
  wish_.offset = 4;
  EXPECT_EQ(Names(), "e f g h ");
  wish_.offset = 8;
  EXPECT_EQ(Names(), "i j ");
  wish_.offset = 10;
  EXPECT_EQ(Names(), "");
  wish_.offset = 0;
  wish_.limit = 0;
  EXPECT_EQ(Names(), "");
  EXPECT_EQ(total_, 10U);
}

TEST_F(ListingTest, IsFilteredByKindAndPattern) {
  Write(Path("a.JPG"), "");
  Write(Path("b.jpg"), "");
  Write(Path("c.txt"), "");
  MakeFolder("d.jpg");
  wish_.pattern = "*.jpg";
  EXPECT_EQ(Names(), "a.JPG b.jpg d.jpg ");
  EXPECT_EQ(total_, 3U);
  wish_.kind = Listing::Kind::kFiles;
  EXPECT_EQ(Names(), "a.JPG b.jpg ");
  wish_.kind = Listing::Kind::kFolders;
  EXPECT_EQ(Names(), "d.jpg ");
  EXPECT_EQ(total_, 1U);
}

TEST_F(ListingTest, LeavesUnfinishedFilesOut) {
  Write(Path(".qelo-part-x"), "");
  EXPECT_EQ(Names(), "");
  EXPECT_EQ(total_, 0U);
}

TEST(Pattern, MatchesAsShellsDo) {
  EXPECT_TRUE(matches("*", ""));
  EXPECT_TRUE(matches("*", "abc"));
  EXPECT_TRUE(matches("a*c", "abbc"));
  EXPECT_TRUE(matches("a*b*c", "axbxbxc"));
  EXPECT_TRUE(matches("?", "\xC3\xBC"));
  EXPECT_TRUE(matches("A?C", "abc"));
  EXPECT_FALSE(matches("", "a"));
  EXPECT_FALSE(matches("?", ""));
  EXPECT_FALSE(matches("a*c", "abcd"));
  EXPECT_FALSE(matches("a?c", "ac"));
}

TEST(Pattern, OfManyStarsTakesNoLongTime) {
  std::string pattern;
  for (int i = 0; i < 127; ++i) {
    pattern += "a*";
  }
  const std::string name(255, 'a');
  const auto begin = std::chrono::steady_clock::now();
  for (int i = 0; i < 100; ++i) {
    EXPECT_FALSE(matches(pattern + "b", name));
  }
  EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(5));
}
