#include "programs/server/Options.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace QELO {
namespace {

class ServerOptions : public testing::Test {
 protected:
  bool Read(std::vector<const char*> words) {
    Options options;
    options.Number("calls", 1, 8, [this](unsigned value) { number = value; });
    options.Text("name", [this](const std::string& value) {
      text = value;
      return value != "bad";
    });
    options.Text(
        "guest", [](const std::string&) { return false; }, "no such account");
    words.insert(words.begin(), "program");
    return options.Read(static_cast<int>(words.size()), const_cast<char**>(words.data()), error);
  }

  unsigned number = 5;
  std::string text = "default";
  static bool AskForHelp(std::vector<const char*> words) {
    words.insert(words.begin(), "program");
    return Options::AskForHelp(static_cast<int>(words.size()), const_cast<char**>(words.data()));
  }

  std::string error;
};

TEST_F(ServerOptions, NothingLeavesTheDefaults) {
  EXPECT_TRUE(Read({}));
  EXPECT_EQ(number, 5u);
  EXPECT_EQ(text, "default");
}

TEST_F(ServerOptions, ValuesAreTakenAndTheLastCounts) {
  EXPECT_TRUE(Read({"--calls", "1", "--name", "a b", "--calls", "8"}));
  EXPECT_EQ(number, 8u);
  EXPECT_EQ(text, "a b");
}

TEST_F(ServerOptions, NumbersBeyondTheBoundsAreRefused) {
  for (const char* value : {"0", "9", "-1", "", "x", "3x", " 3", "99999999999"}) {
    EXPECT_FALSE(Read({"--calls", value})) << value;
    EXPECT_EQ(error, "--calls needs another value") << value;
  }
}

TEST_F(ServerOptions, UnknownAndIncompleteOnesAreNamed) {
  EXPECT_FALSE(Read({"--other", "1"}));
  EXPECT_EQ(error, "there is no option --other");
  EXPECT_FALSE(Read({"calls", "1"}));
  EXPECT_EQ(error, "there is no option calls");
  EXPECT_FALSE(Read({"--calls"}));
  EXPECT_EQ(error, "--calls needs a value");
  EXPECT_FALSE(Read({"--name", "bad"}));
  EXPECT_EQ(error, "--name needs another value");
}

TEST_F(ServerOptions, WhatIsWrongWithAValueIsSaidInTheOptionsOwnWords) {
  EXPECT_FALSE(Read({"--guest", "nobody-here"}));
  EXPECT_EQ(error, "--guest: no such account");
}

TEST_F(ServerOptions, HelpIsAskedForInTwoWaysAnywhere) {
  EXPECT_TRUE(AskForHelp({"--help"}));
  EXPECT_TRUE(AskForHelp({"--calls", "1", "-h"}));
  EXPECT_FALSE(AskForHelp({}));
  EXPECT_FALSE(AskForHelp({"--calls", "help", "--helper"}));
}

}  // namespace
}  // namespace QELO
