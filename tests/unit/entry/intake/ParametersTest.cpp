// Query string and request body become parameters.

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

class ParameterIntake : public CgiTest {
 protected:
  /// Lays the process environment into the request and takes the parameters.
  bool Take() {
    Json::Value environment(Json::objectValue);
    for (const char* name : {"REQUEST_METHOD", "QUERY_STRING", "CONTENT_LENGTH", "CONTENT_TYPE"}) {
      if (getenv(name) != nullptr) {
        environment[name] = getenv(name);
      }
    }
    entry_.Request()->InitEnv(environment);
    return entry_.InitParam(params_);
  }

  int Code() { return entry_.Response()->GetError(); }

  /// Takes a POST whose CONTENT_LENGTH is this text.
  bool TakeLength(const std::string& length, const std::string& body = "a=b") {
    Post(body);
    Set("CONTENT_LENGTH", length);
    return Take();
  }

  TestEntry entry_;
  Json::Value params_{Json::objectValue};
};

TEST_F(ParameterIntake, GetWithoutQueryStringYieldsNothing) {
  Set("REQUEST_METHOD", "GET");
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_, Parse("{}"));
}

TEST_F(ParameterIntake, EmptyQueryStringYieldsAnEmptySection) {
  Get("");
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_, Parse(R"({"getParam": {}})"));
}

TEST_F(ParameterIntake, QueryStringIsDecodedAndReadAsJsonWhereItIs) {
  Get("api=QELO.A&version=1&list=%5B1,2%5D&name=a+b%21");
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_, Parse(R"({"getParam": {"api": "QELO.A", "version": 1, "list": [1, 2],
                                   "name": "a b!"}})"));
}

TEST_F(ParameterIntake, QueryStringThatIsNoTextSets101) {
  entry_.Request()->Serialize()["environ"]["QUERY_STRING"] = 5;
  EXPECT_FALSE(entry_.InitParam(params_));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, BrokenQueryLineFailsWithoutAnError) {
  Get("a=%zz");
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 0);
}

TEST_F(ParameterIntake, BrokenQueryLineAnswers101) {
  Get("a=%zz");
  EXPECT_EQ(Serve().Code(), 101);
}

TEST_F(ParameterIntake, QueryLineThatCannotBeDecipheredFails) {
  platform->detectResult = 0;
  Get("a=b");
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 0);
}

TEST_F(ParameterIntake, HeadRequestReadsNoBody) {
  Post("a=b");
  Set("REQUEST_METHOD", "HEAD");
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_, Parse("{}"));
  EXPECT_EQ(RestOfInput(), "a=b");
}

TEST_F(ParameterIntake, PostYieldsBothSections) {
  Post("b=2");
  Set("QUERY_STRING", "a=1");
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_, Parse(R"({"getParam": {"a": 1}, "postParam": {"b": 2}})"));
}

TEST_F(ParameterIntake, PostIsReadAlsoWhenTheQueryNamesTheCall) {
  Post("b=2");
  Set("QUERY_STRING", "api=x&version=1&method=y");
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_["postParam"], Parse(R"({"b": 2})"));
}

TEST_F(ParameterIntake, PostWithLengthZeroSets101) {
  EXPECT_FALSE(TakeLength("0"));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostWithoutALengthSets101) {
  Post("a=b");
  unsetenv("CONTENT_LENGTH");
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostWithANegativeLengthSets101) {
  EXPECT_FALSE(TakeLength("-5"));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostWithALengthBeyond64BitsSets101) {
  EXPECT_FALSE(TakeLength("9999999999999999999"));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostBeyond16MiBSets101) {
  EXPECT_FALSE(TakeLength("16777217"));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostWithALengthThatIsNoNumberSets101) {
  EXPECT_FALSE(TakeLength("3x"));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostTooLongForMemorySets101) {
  EXPECT_FALSE(TakeLength("9223372036854775806"));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostShorterThanItsLengthIsStillTaken) {
  EXPECT_TRUE(TakeLength("1000", "a=1&b=2"));
  EXPECT_EQ(params_["postParam"], Parse(R"({"a": 1, "b": 2})"));
}

TEST_F(ParameterIntake, PostLongerThanItsLengthIsCut) {
  EXPECT_TRUE(TakeLength("3", "a=1&b=2"));
  EXPECT_EQ(params_["postParam"], Parse(R"({"a": 1})"));
}

TEST_F(ParameterIntake, PostEndsAtItsFirstNul) {
  Post(std::string("a=1\0&b=2", 8));
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_["postParam"], Parse(R"({"a": 1})"));
}

TEST_F(ParameterIntake, PostWithNothingInItSets101) {
  EXPECT_FALSE(TakeLength("5", ""));
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostWithABrokenLineSets101) {
  Post("a=%zz");
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, PostThatCannotBeReadSets101) {
  const int folder = open(".", O_RDONLY | O_CLOEXEC);
  const Redirection input(STDIN_FILENO, folder);
  close(folder);
  Set("REQUEST_METHOD", "POST");
  Set("CONTENT_LENGTH", "5");
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, NothingIsLeftToReadAfterAPost) {
  Post("a=1&rest");
  Set("CONTENT_LENGTH", "3");
  EXPECT_TRUE(Take());
  EXPECT_EQ(RestOfInput(), "");
}

TEST_F(ParameterIntake, PostIntoASectionThatIsNoObjectFails) {
  Post("a=b");
  Take();
  Json::Value section(Json::arrayValue);
  EXPECT_FALSE(entry_.InitPostParam(section));
  section = Json::Value();
  EXPECT_FALSE(entry_.InitPostParam(section));
}

TEST_F(ParameterIntake, ExceptionDuringAPostIsLoggedAndSets101) {
  platform->aesKeyResult = 0;
  platform->decryptAES = [](const std::string&, const std::string&, std::string&) -> bool {
    throw std::runtime_error("cipher broke");
  };
  Post("__nEkOtReHpIc=t&__tXeTrEhPiC=x");
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 101);
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_EQ(SyslogCapture::Messages()[0].text, "WebEntry:275 cipher broke");
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
}

TEST_F(ParameterIntake, UploadNamedInTheQueryLeavesTheBodyUnread) {
  Post("--x\r\nbody");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  Set("QUERY_STRING", "api=x&version=1&method=y");
  EXPECT_TRUE(Take());
  EXPECT_FALSE(params_.isMember("postParam"));
  EXPECT_EQ(RestOfInput(), "--x\r\nbody");
  EXPECT_EQ(entry_.Response()->GetHeader("Content-type", ""), "text/plain; charset=\"UTF-8\"");
}

TEST_F(ParameterIntake, UploadWhoseFieldsCannotBeReadSets101) {
  Post("--x\r\nbody");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  Set("QUERY_STRING", "api=x&version=1");
  platform->upload.fields = -3;
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 101);
  EXPECT_EQ(entry_.Response()->GetHeader("Content-type", ""), "text/plain; charset=\"UTF-8\"");
}

TEST_F(ParameterIntake, UploadNamesItsCallInTheFieldsInFrontOfItsFile) {
  Post("--x\r\nbody");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  Set("QUERY_STRING", "api=x&version=1");
  platform->upload.parameters = {{"method", "m"}, {"n", "5"}};
  platform->upload.positions[0] = 5'000'000'000;
  platform->upload.positions[1] = 12'000'000'000;
  EXPECT_TRUE(Take());
  EXPECT_EQ(params_["postParam"], Parse(R"({"method": "m", "n": 5})"));
  EXPECT_EQ(entry_.Request()->GetEnv("CONTENT_LENGTH"), "7000000000");
  EXPECT_EQ(platform->calls.back(), "QeloCgiLoadUploadNumParams(3, 0, 256)");
  // The context's hash is emptied for the next one.
  platform->upload.parameters = {{"k", "v"}};
  Json::Value section(Json::objectValue);
  EXPECT_TRUE(entry_.LoadUploadAPIDesc(section));
  EXPECT_EQ(section, Parse(R"({"k": "v"})"));
}

TEST_F(ParameterIntake, UploadWhoseFieldsHoldTooManyValuesSets101) {
  Post("--x\r\nbody");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  std::string many = "[0";
  for (int i = 0; i < 50'000; ++i) {
    many += ",0";
  }
  platform->upload.parameters = {{"many", many + "]"}};
  EXPECT_FALSE(Take());
  EXPECT_EQ(Code(), 101);
}

TEST_F(ParameterIntake, UploadIsNoPost) {
  Post("a=b");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  Take();
  Json::Value section(Json::objectValue);
  EXPECT_FALSE(entry_.InitPostParam(section));
  EXPECT_EQ(RestOfInput(), "a=b");
}

}  // namespace
}  // namespace QELO
