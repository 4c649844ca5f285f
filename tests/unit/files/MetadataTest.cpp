#include "text/Metadata.h"

#include <gtest/gtest.h>

#include <string>

#include "text/Base64.h"

using namespace files;

namespace {

std::string decoded(const std::string& text) {
  std::string bytes = "unchanged";
  decodeBase64(text, bytes);
  return bytes;
}

}  // namespace

TEST(Base64, IsDecodedWithOrWithoutItsEnd) {
  EXPECT_EQ(decoded(""), "");
  EXPECT_EQ(decoded("Zg=="), "f");
  EXPECT_EQ(decoded("Zg"), "f");
  EXPECT_EQ(decoded("Zm8="), "fo");
  EXPECT_EQ(decoded("Zm9v"), "foo");
  EXPECT_EQ(decoded("Zm9vYmFy"), "foobar");
  EXPECT_EQ(decoded("/+8="), "\xFF\xEF");
}

TEST(Base64, WhatIsNoneIsRefused) {
  for (const char* text : {"Z", "Zm9vY", "Zm 9v", "Zm9v\n", "====", "Zm9v===", "-_8=", "Z=m9"}) {
    EXPECT_EQ(decoded(text), "unchanged") << text;
  }
}

TEST(Metadata, HasValuesByKey) {
  const std::string header = "filetype dGV4dA==,filename Zm9v, is_private,empty ";
  EXPECT_EQ(metadataOf(header, "filename"), "foo");
  EXPECT_EQ(metadataOf(header, "filetype"), "text");
  EXPECT_EQ(metadataOf(header, "is_private"), "");
  EXPECT_EQ(metadataOf(header, "file"), "");
  EXPECT_EQ(metadataOf("", "filename"), "");
  EXPECT_EQ(metadataOf(",,,", "filename"), "");
  EXPECT_EQ(metadataOf("filename !", "filename"), "");
}

TEST(Metadata, PlainTextsAreThoseThatAnAddressTakes) {
  EXPECT_TRUE(isPlain("aZ09-_.~"));
  for (const char* text : {"a&b", "a b", "\"", "%22", "a\r\nb", "\xC3\xBC"}) {
    EXPECT_FALSE(isPlain(text)) << text;
  }
}
