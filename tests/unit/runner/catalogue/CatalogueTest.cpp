#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class Catalogue : public RunnerTest {
 protected:
  static Json::Value Valid() {
    return Parse(R"({"lib": "x.so", "minVersion": 1, "maxVersion": 2, "methods": {}})");
  }
  static std::string LibOf(Json::Value& catalogue, const std::string& api) {
    return JsonHelper::asString(JsonHelper::member(catalogue[api], "lib"));
  }
  static void WriteNamed(const std::string& file, const std::string& api, const std::string& lib) {
    Json::Value description = Valid();
    description["lib"] = lib;
    Json::Value content;
    content[api] = description;
    Write(file, JsonHelper::toString(content));
  }
  Json::Value catalogue{Json::objectValue};
};

TEST_F(Catalogue, DescriptionNeedsLibVersionsAndMethodsOfTheRightTypes) {
  TestRunner tested;
  EXPECT_TRUE(tested.CheckLibDescription(Valid()));
  EXPECT_FALSE(tested.CheckLibDescription(Json::Value()));
  EXPECT_FALSE(tested.CheckLibDescription(Json::Value("text")));
  EXPECT_FALSE(tested.CheckLibDescription(Json::Value(Json::arrayValue)));
  for (const char* key : {"lib", "minVersion", "maxVersion", "methods"}) {
    Json::Value lacking = Valid();
    lacking.removeMember(key);
    EXPECT_FALSE(tested.CheckLibDescription(lacking)) << key;
    Json::Value wrong = Valid();
    wrong[key] = Json::Value(Json::arrayValue);
    EXPECT_FALSE(tested.CheckLibDescription(wrong)) << key;
  }
}

TEST_F(Catalogue, EmptyLibPassesTheCheck) {
  Json::Value description = Valid();
  description["lib"] = "";
  EXPECT_TRUE(TestRunner().CheckLibDescription(description));
}

TEST_F(Catalogue, MinimumAboveMaximumPassesTheCheck) {
  Json::Value description = Valid();
  description["minVersion"] = 3;
  description["maxVersion"] = 1;
  EXPECT_TRUE(TestRunner().CheckLibDescription(description));
}

TEST_F(Catalogue, PriorityIsAnIntegerFromMinusTenToTen) {
  TestRunner tested;
  const auto accepts = [&](const Json::Value& priority) {
    Json::Value description = Valid();
    description["priority"] = priority;
    return tested.CheckLibDescription(description);
  };
  EXPECT_TRUE(accepts(10));
  EXPECT_TRUE(accepts(-10));
  EXPECT_FALSE(accepts(11));
  EXPECT_FALSE(accepts(-11));
  EXPECT_FALSE(accepts("5"));
  EXPECT_FALSE(accepts(1.5));
  EXPECT_FALSE(accepts(Json::Value()));
}

TEST_F(Catalogue, MissingKeysAreFilledFromLibDef) {
  WriteLibDef(R"({"authLevel": 2, "allowUser": ["normal.local"], "priority": 7})");
  Json::Value description = Valid();
  Json::Value& filled = TestRunner().ApplyLibDef(description);
  EXPECT_EQ(&filled, &description);
  EXPECT_EQ(filled["authLevel"], Json::Value(2));
  EXPECT_EQ(filled["allowUser"][0], Json::Value("normal.local"));
  EXPECT_EQ(filled["priority"], Json::Value(7));
  EXPECT_EQ(filled["requestFormat"], Json::Value("JSON"));
}

TEST_F(Catalogue, KeysThereAreKept) {
  Json::Value description = Valid();
  description["authLevel"] = 0;
  description["requestFormat"] = "XML";
  TestRunner().ApplyLibDef(description);
  EXPECT_EQ(description["authLevel"], Json::Value(0));
  EXPECT_EQ(description["requestFormat"], Json::Value("XML"));
}

TEST_F(Catalogue, UnreadableLibDefGivesNullDefaults) {
  for (const char* text : {"not json", "[1, 2]"}) {
    WriteLibDef(text);
    Json::Value description = Valid();
    TestRunner().ApplyLibDef(description);
    EXPECT_TRUE(JsonHelper::hasMember(description, "authLevel"));
    EXPECT_TRUE(description["authLevel"].isNull());
    EXPECT_EQ(description["requestFormat"], Json::Value("JSON"));
  }
}

TEST_F(Catalogue, MissingLibDefGivesNullDefaultsAndNoAttributes) {
  std::filesystem::remove(Paths::kLibDef);
  WriteNamed("QELO.A.lib", "QELO.A", "x");
  TestRunner tested;
  EXPECT_TRUE(tested.InitLibDesc(catalogue, "QELO.A"));
  for (const char* key : {"authLevel", "allowUser", "priority"}) {
    ASSERT_TRUE(catalogue["QELO.A"].isMember(key)) << key;
    EXPECT_TRUE(catalogue["QELO.A"][key].isNull()) << key;
  }
  EXPECT_EQ(catalogue["QELO.A"]["requestFormat"], Json::Value("JSON"));
  EXPECT_TRUE(tested.GetMethod("QELO.A", 1, "plain").isNull());
  EXPECT_FALSE(tested.GetMethodAttr("QELO.A", 1, "plain", "allowDemo"));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(Catalogue, LongestExistingPrefixWins) {
  WriteNamed("QELO.A.lib", "QELO.A.B.X", "short");
  WriteNamed("QELO.A.B.lib", "QELO.A.B.X", "long");
  TestRunner tested;
  EXPECT_TRUE(tested.InitLibDesc(catalogue, "QELO.A.B.X"));
  EXPECT_EQ(LibOf(catalogue, "QELO.A.B.X"), "long");
}

TEST_F(Catalogue, FirstComponentAloneIsNoCandidate) {
  WriteNamed("QELO.lib", "QELO.A.B", "x");
  EXPECT_FALSE(TestRunner().InitLibDesc(catalogue, "QELO.A.B"));
}

TEST_F(Catalogue, NameWithoutDotIsItsOnlyCandidate) {
  WriteNamed("Plain.lib", "Plain", "x");
  EXPECT_TRUE(TestRunner().InitLibDesc(catalogue, "Plain"));
  EXPECT_EQ(LibOf(catalogue, "Plain"), "x");
}

TEST_F(Catalogue, NameOfManyDotsIsSoughtByItsFirstFiveComponents) {
  WriteNamed("Q.A.B.C.D.E.lib", "Q.A.B.C.D.E", "whole");
  EXPECT_FALSE(TestRunner().InitLibDesc(catalogue, "Q.A.B.C.D.E"));
  WriteNamed("Q.A.B.C.D.lib", "Q.A.B.C.D.E", "five");
  EXPECT_TRUE(TestRunner().InitLibDesc(catalogue, "Q.A.B.C.D.E"));
  EXPECT_EQ(LibOf(catalogue, "Q.A.B.C.D.E"), "five");
}

TEST_F(Catalogue, NameOfManyDotsIsSoughtByItsFirstTwoToFiveComponents) {
  for (const std::string file : {"Q.A", "Q.A.B", "Q.A.B.C", "Q.A.B.C.D"}) {
    WriteNamed(file + ".lib", "Q.A.B.C.D.E", file);
    Json::Value alone(Json::objectValue);
    EXPECT_TRUE(TestRunner().InitLibDesc(alone, "Q.A.B.C.D.E")) << file;
    EXPECT_EQ(LibOf(alone, "Q.A.B.C.D.E"), file);
    std::filesystem::remove(file + ".lib");
  }
}

TEST_F(Catalogue, LongestOfTheFilesOfANameOfManyDotsWins) {
  for (const std::string file : {"Q.A", "Q.A.B", "Q.A.B.C", "Q.A.B.C.D"}) {
    WriteNamed(file + ".lib", "Q.A.B.C.D.E", file);  // besides the shorter ones
    Json::Value longest(Json::objectValue);
    EXPECT_TRUE(TestRunner().InitLibDesc(longest, "Q.A.B.C.D.E")) << file;
    EXPECT_EQ(LibOf(longest, "Q.A.B.C.D.E"), file);
  }
}

TEST_F(Catalogue, OneFileDescribesSeveralApis) {
  Json::Value file;
  file["QELO.A.B"] = Valid();
  file["QELO.A.C"] = Valid();
  file["QELO.A.Broken"] = "text";
  Write("QELO.A.lib", JsonHelper::toString(file));
  EXPECT_TRUE(TestRunner().InitLibDesc(catalogue, "QELO.A.B"));
  EXPECT_TRUE(catalogue.isMember("QELO.A.C"));
  EXPECT_FALSE(catalogue.isMember("QELO.A.Broken"));
  EXPECT_EQ(SyslogCapture::Count("WebAPI description QELO.A.Broken is not valid."), 1);
}

TEST_F(Catalogue, ApiAbsentFromItsFileLoadsButIsNotAdded) {
  WriteNamed("QELO.A.lib", "QELO.A.Other", "x");
  TestRunner tested;
  MakeRequest("QELO.A.B", 1, "get");
  EXPECT_TRUE(tested.InitLibDesc(catalogue, "QELO.A.B"));
  EXPECT_FALSE(tested.AddAPIInfo(request.get()));
}

TEST_F(Catalogue, ApiAbsentFromTheFileThatItsRunnerLoadedIsNotAdded) {
  WriteNamed("QELO.A.lib", "QELO.A.Other", "x");
  TestRunner tested;
  MakeRequest("QELO.A.B", 1, "get");
  EXPECT_FALSE(tested.CheckRequestParam(request.get(), response.get()));
  EXPECT_TRUE(SyslogCapture::Messages().empty());  // the load itself went well
  EXPECT_FALSE(tested.AddAPIInfo(request.get()));
  EXPECT_EQ(request->GetAPIInfo("lib", "none"), Json::Value("none"));
  MakeRequest("QELO.A.Other", 1, "get");
  EXPECT_TRUE(tested.AddAPIInfo(request.get()));
  EXPECT_EQ(request->GetAPIInfo("lib", "none"), Json::Value("x"));
}

TEST_F(Catalogue, AddingADescriptionLoadsNoFile) {
  WriteNamed("QELO.A.lib", "QELO.A.B", "x");
  TestRunner tested;
  MakeRequest("QELO.A.B", 1, "get");
  EXPECT_FALSE(tested.AddAPIInfo(request.get()));
  EXPECT_EQ(request->GetAPIInfo("lib", "none"), Json::Value("none"));
  tested.GetMethod("QELO.A.B", 1, "get");  // loads it
  std::filesystem::remove("QELO.A.lib");
  EXPECT_TRUE(tested.AddAPIInfo(request.get()));
  EXPECT_EQ(request->GetAPIInfo("lib", "none"), Json::Value("x"));
}

TEST_F(Catalogue, KnownApiIsNotReadAgain) {
  catalogue["QELO.A.B"] = Valid();
  EXPECT_TRUE(TestRunner().InitLibDesc(catalogue, "QELO.A.B"));
  EXPECT_EQ(LibOf(catalogue, "QELO.A.B"), "x.so");
}

TEST_F(Catalogue, EmptyNameAndNullRequestFail) {
  TestRunner tested;
  EXPECT_FALSE(tested.InitLibDesc(catalogue, ""));
  EXPECT_FALSE(tested.InitLibDesc(catalogue, static_cast<APIRequest*>(nullptr)));
  EXPECT_FALSE(tested.AddAPIInfo(nullptr));
}

TEST_F(Catalogue, MissingFileIsLogged) {
  EXPECT_FALSE(TestRunner().InitLibDesc(catalogue, "QELO.No.Such"));
  EXPECT_EQ(SyslogCapture::Count("WebAPI QELO.No.Such is not valid"), 1);
  EXPECT_EQ(SyslogCapture::Messages().at(0).text.find("APIRunner.cpp:"), 0u);
  EXPECT_EQ(SyslogCapture::Messages().at(0).priority, 3);
}

TEST_F(Catalogue, UnparsableFileOrDirectoryIsLogged) {
  Write("QELO.A.lib", "{ not json");
  EXPECT_FALSE(TestRunner().InitLibDesc(catalogue, "QELO.A"));
  EXPECT_EQ(SyslogCapture::Count("WebAPI description file QELO.A.lib is not valid"), 1);
  std::filesystem::create_directory("QELO.D.lib");
  EXPECT_FALSE(TestRunner().InitLibDesc(catalogue, "QELO.D"));
  EXPECT_EQ(SyslogCapture::Count("WebAPI description file QELO.D.lib is not valid"), 1);
}

TEST_F(Catalogue, FileThatIsNoJsonIsLoggedWithThePlace) {
  Write("QELO.A.lib", "{\n  \"QELO.A\": {\n    \"lib\" \"x.so\"\n  }\n}\n");
  EXPECT_FALSE(TestRunner().InitLibDesc(catalogue, "QELO.A"));
  EXPECT_EQ(SyslogCapture::Count("QELO.A.lib:3:11: no JSON from here on"), 1);
  SyslogCapture::Clear();
  EXPECT_TRUE(TestRunner().InitLibDesc(catalogue));
  EXPECT_EQ(SyslogCapture::Count("QELO.A.lib:3:11: no JSON from here on"), 1);
}

TEST_F(Catalogue, InvalidDescriptionIsLoggedWithTheKeyThatIsWrong) {
  Json::Value file;
  file["QELO.A.B"] = Valid();
  file["QELO.A.B"]["maxVersion"] = "2";
  file["QELO.A.C"] = Valid();
  Write("QELO.A.lib", JsonHelper::toString(file));
  EXPECT_TRUE(TestRunner().InitLibDesc(catalogue, "QELO.A.B"));
  EXPECT_EQ(SyslogCapture::Count("APIRunner.cpp:"), 2);
  EXPECT_EQ(SyslogCapture::Count("WebAPI description QELO.A.B is not valid."), 1);
  EXPECT_EQ(SyslogCapture::Count("description QELO.A.B: \"maxVersion\" is no integer"), 1);
}

TEST_F(Catalogue, LibDefThatCannotBeUsedIsLogged) {
  WriteLibDef("{\"authLevel\": }");
  TestRunner();
  EXPECT_EQ(SyslogCapture::Count(std::string(Paths::kLibDef) + ":1:15: no JSON from here on"), 1);
  WriteLibDef("[]");
  TestRunner();
  EXPECT_EQ(SyslogCapture::Count(std::string(Paths::kLibDef) + ": it is no object"), 1);
}

TEST_F(Catalogue, FileOfAnotherTypeAddsNothing) {
  Write("QELO.A.lib", "[1, {\"QELO.A\": {}}]");
  EXPECT_TRUE(TestRunner().InitLibDesc(catalogue, "QELO.A"));
  EXPECT_TRUE(catalogue.empty());
}

TEST_F(Catalogue, NameThatLeavesTheDirectoryIsNeverOpened) {
  const std::string outside = (directory / "sub").string();
  std::filesystem::create_directory(outside);
  WriteNamed("QELO.A.lib", "QELO.A", "x");
  std::filesystem::current_path(outside);
  TestRunner tested;
  for (const std::string& api :
       {std::string("../QELO.A"), directory.string() + "/QELO.A", std::string("QELO.A\0x", 8)}) {
    EXPECT_FALSE(tested.InitLibDesc(catalogue, api)) << api;
  }
  EXPECT_TRUE(catalogue.empty());
}

TEST_F(Catalogue, NameOfAnyLettersFindsItsFile) {
  TestRunner tested;
  for (const char* api : {"QELO.My API", "QELO.B+C", "QELO.\xc3\x84", "QELO.x~y"}) {
    WriteNamed(std::string(api) + ".lib", api, "x");
    EXPECT_TRUE(tested.InitLibDesc(catalogue, api)) << api;
    EXPECT_TRUE(JsonHelper::hasMember(catalogue, api)) << api;
  }
}

TEST_F(Catalogue, WhatCanHoldNoDescriptionsStaysAsItIs) {
  TestRunner tested;
  WriteNamed("QELO.A.lib", "QELO.A", "x");
  for (const char* text : {"[]", "3", "\"s\"", "true"}) {
    Json::Value value = Parse(text);
    EXPECT_EQ(tested.ApplyLibDef(value), Parse(text));
    EXPECT_TRUE(tested.InitLibDesc(value, "QELO.A"));
    EXPECT_TRUE(tested.InitLibDesc(value));
    EXPECT_EQ(value, Parse(text));
  }
}

TEST_F(Catalogue, LoadingAllReadsEveryGoodFile) {
  TestRunner tested;
  EXPECT_FALSE(tested.InitLibDesc(catalogue));  // nothing matches
  WriteNamed("QELO.A.lib", "QELO.A", "a");
  WriteNamed("QELO.B.lib", "QELO.B", "b");
  Write("QELO.C.lib", "broken");
  Write("QELO.D.txt", "{}");
  EXPECT_TRUE(tested.InitLibDesc(catalogue));
  EXPECT_EQ(catalogue.getMemberNames(), (std::vector<std::string>{"QELO.A", "QELO.B"}));
}

class MethodLookup : public Catalogue {
 protected:
  void SetUp() override {
    Catalogue::SetUp();
    Json::Value description = Valid();
    description["methods"] = Parse(R"({
      "1": ["plain", {"first": {"allowUpload": true, "other": false}, "second": {"never": true}},
            {}, 7, {"named": "text"}],
      "2": "no list"})");
    WriteDescription(description);
    tested = std::make_unique<TestRunner>();
  }
  std::unique_ptr<TestRunner> tested;
};

TEST_F(MethodLookup, ObjectEntryGivesItsAttributes) {
  EXPECT_TRUE(tested->GetMethodAttr("QELO.Test.Call", 1, "first", "allowUpload"));
  EXPECT_FALSE(tested->GetMethodAttr("QELO.Test.Call", 1, "first", "other"));
  EXPECT_TRUE(tested->GetMethod("QELO.Test.Call", 1, "first").isMember("allowUpload"));
}

TEST_F(MethodLookup, AttributeMissingFromAMethodsOwnIsFalse) {
  EXPECT_FALSE(tested->GetMethodAttr("QELO.Test.Call", 1, "first", "byDefault"));
}

TEST_F(MethodLookup, PlainStringTakesTheDefaults) {
  EXPECT_TRUE(tested->GetMethodAttr("QELO.Test.Call", 1, "plain", "byDefault"));
  EXPECT_FALSE(tested->GetMethodAttr("QELO.Test.Call", 1, "plain", "allowUpload"));
}

TEST_F(MethodLookup, OnlyTheFirstMemberOfAnEntryHasAttributes) {
  EXPECT_FALSE(tested->GetMethodAttr("QELO.Test.Call", 1, "second", "never"));
  EXPECT_TRUE(tested->GetMethodAttr("QELO.Test.Call", 1, "second", "byDefault"));
}

TEST_F(MethodLookup, AttributesThatAreNoObjectGiveTheDefaults) {
  EXPECT_EQ(tested->GetMethod("QELO.Test.Call", 1, "named"), Json::Value("text"));
  EXPECT_TRUE(tested->GetMethodAttr("QELO.Test.Call", 1, "named", "byDefault"));
}

TEST_F(MethodLookup, UnknownApiVersionOrMethodGivesTheDefaults) {
  EXPECT_TRUE(tested->GetMethodAttr("QELO.No.Such", 1, "plain", "byDefault"));
  EXPECT_TRUE(tested->GetMethodAttr("QELO.Test.Call", 2, "plain", "byDefault"));
  EXPECT_TRUE(tested->GetMethodAttr("QELO.Test.Call", 3, "plain", "byDefault"));
  EXPECT_TRUE(tested->GetMethodAttr("QELO.Test.Call", 1, "absent", "byDefault"));
}

TEST_F(MethodLookup, NullRequestOrEmptyAttributeIsFalse) {
  MakeRequest("QELO.Test.Call", 1, "plain");
  EXPECT_TRUE(tested->GetMethodAttr(request.get(), "byDefault"));
  EXPECT_FALSE(tested->GetMethodAttr(request.get(), ""));
  EXPECT_FALSE(tested->GetMethodAttr(nullptr, "byDefault"));
}

}  // namespace
}  // namespace QELO
