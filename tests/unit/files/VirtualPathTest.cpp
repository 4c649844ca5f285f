#include "paths/VirtualPath.h"

#include <gtest/gtest.h>

#include <string>

using namespace files;

namespace {

Reason parsed(const std::string& text) {
  VirtualPath path;
  return VirtualPath::Parse(text, path);
}

std::string repeated(const std::string& text, size_t times) {
  std::string all;
  for (size_t i = 0; i < times; ++i) {
    all += text;
  }
  return all;
}

}  // namespace

TEST(VirtualPath, TakesItsPartsApart) {
  VirtualPath path;
  ASSERT_EQ(VirtualPath::Parse("/own/a b/c", path), Reason::kNone);
  EXPECT_EQ(path.Share(), "own");
  EXPECT_EQ(path.Below(), "a b/c");
  EXPECT_EQ(path.Name(), "c");
  EXPECT_EQ(path.Text(), "/own/a b/c");
  EXPECT_EQ(path.Parent().Text(), "/own/a b");
  EXPECT_EQ(path.Parent().Parent().Below(), ".");
  EXPECT_TRUE(path.Parent().Parent().IsShare());
  EXPECT_TRUE(path.Parent().Parent().Parent().IsRoot());
  EXPECT_TRUE(path.Parent().Parent().Parent().Parent().IsRoot());
  EXPECT_EQ(path.Child("d").Text(), "/own/a b/c/d");
}

TEST(VirtualPath, RootIsTheListOfSharedFolders) {
  VirtualPath path;
  ASSERT_EQ(VirtualPath::Parse("/", path), Reason::kNone);
  EXPECT_TRUE(path.IsRoot());
  EXPECT_EQ(path.Text(), "/");
  EXPECT_EQ(path.Share(), "");
  EXPECT_EQ(path.Name(), "");
}

TEST(VirtualPath, OneSlashAtTheEndIsLeftAway) {
  VirtualPath path;
  ASSERT_EQ(VirtualPath::Parse("/own/a/", path), Reason::kNone);
  EXPECT_EQ(path.Text(), "/own/a");
  EXPECT_EQ(parsed("/own/a//"), Reason::kBadPath);
}

TEST(VirtualPath, WhatCouldLeadElsewhereIsRefused) {
  for (const char* text : {"", "home", "../home", "/..", "/own/..", "/own/../etc", "/own/./a",
                           "/own//a", "//", "/own/a/..", "/.", "home/../../etc/passwd"}) {
    EXPECT_EQ(parsed(text), Reason::kBadPath) << text;
  }
  EXPECT_EQ(parsed(std::string("/own/a\0/b", 10)), Reason::kBadPath);
  EXPECT_EQ(parsed("/own/..."), Reason::kNone) << "three dots are a name";
}

TEST(VirtualPath, LengthAndDepthHaveLimits) {
  EXPECT_EQ(parsed("/own/" + std::string(255, 'x')), Reason::kNone);
  EXPECT_EQ(parsed("/own/" + std::string(256, 'x')), Reason::kBadPath);
  EXPECT_EQ(parsed(repeated("/x", VirtualPath::kDeepest)), Reason::kNone);
  EXPECT_EQ(parsed(repeated("/x", VirtualPath::kDeepest + 1)), Reason::kTooDeep);
  const std::string longest = repeated("/" + std::string(255, 'x'), 16);
  ASSERT_EQ(longest.size(), VirtualPath::kLongest);
  EXPECT_EQ(parsed(longest), Reason::kNone);
  EXPECT_EQ(parsed(longest + "/"), Reason::kBadPath);
}

TEST(VirtualPath, RefusedTextLeavesThePath) {
  VirtualPath path;
  VirtualPath::Parse("/own/a", path);
  VirtualPath::Parse("/own/../a", path);
  EXPECT_EQ(path.Text(), "/own/a");
}

TEST(VirtualPath, NamesOfUnfinishedFilesCannotBeNamed) {
  EXPECT_EQ(parsed("/own/.qelo-part-1"), Reason::kBadPath);
  EXPECT_EQ(parsed("/own/.qelo-part-1/a"), Reason::kBadPath);
  EXPECT_FALSE(isNewName(".qelo-part-1"));
  EXPECT_TRUE(isTemporaryName(".qelo-part-1"));
}

TEST(VirtualPath, IsWithinItselfAndFoldersAbove) {
  VirtualPath path;
  VirtualPath above;
  VirtualPath beside;
  VirtualPath::Parse("/own/ab/c", path);
  VirtualPath::Parse("/own/ab", above);
  VirtualPath::Parse("/own/a", beside);
  EXPECT_TRUE(path.IsWithin(path));
  EXPECT_TRUE(path.IsWithin(above));
  EXPECT_FALSE(path.IsWithin(beside));
  EXPECT_FALSE(above.IsWithin(path));
}

TEST(NewName, IsOnePartOfReadableText) {
  for (const char* name :
       {"a", "a b", "gr\xC3\xBC\xC3\x9F", ".hidden", "...", "-rf", "a\\b", "*"}) {
    EXPECT_TRUE(isNewName(name)) << name;
  }
  for (const char* name : {"", ".", "..", "a/b", "/", "../a", "a\nb", "a\rb", "\x01", "a\x7F",
                           "\x1B[31m", "na\xEFve"}) {
    EXPECT_FALSE(isNewName(name)) << name;
  }
  EXPECT_FALSE(isNewName(std::string("a\0b", 3)));
  EXPECT_TRUE(isNewName(std::string(255, 'x')));
  EXPECT_FALSE(isNewName(std::string(256, 'x')));
}
