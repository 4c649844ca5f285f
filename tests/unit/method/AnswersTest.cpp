// What a function gives or throws, and the answer that it becomes.

#include <map>
#include <new>
#include <stdexcept>

#include "tests/unit/method/Fixture.h"

namespace QELO {
namespace {

class MethodAnswers : public MethodTest {
 protected:
  void ExpectNoAnswer(Function method) {
    EXPECT_EQ(Answer(method), R"({"error":{"code":117},"success":false})");
  }
};

void nothing() {}
int number() {
  return 5;
}
const char* text() {
  return "ready";
}
Json::Value json(const Call& call) {
  Json::Value data;
  data["user"] = call.User();
  return data;
}
std::vector<std::optional<double>> reals() {
  return {0.5, std::nullopt, 1.0 / 0.0};
}

TEST_F(MethodAnswers, ValuesAreTheData) {
  EXPECT_EQ(Answer(Method<nothing>), R"({"success":true})");
  EXPECT_EQ(Answer(Method<number>), R"({"data":5,"success":true})");
  EXPECT_EQ(Answer(Method<text>), R"({"data":"ready","success":true})");
  EXPECT_EQ(Answer(Method<json>), R"({"data":{"user":"alice"},"success":true})");
  EXPECT_EQ(Answer(Method<reals>), R"({"data":[0.5,null,null],"success":true})");
}

TEST_F(MethodAnswers, LambdaIsAMethodToo) {
  EXPECT_EQ(Answer(Method<[](const Call& call) { return call.Has("n"); }>, R"({"n":null})"),
            R"({"data":true,"success":true})");
}

Answered byItself(Call& call) {
  call.Response().SetError(WEBAPI_ERR_NO_SUCH_METHOD);
  return {};
}

TEST_F(MethodAnswers, AnsweredLeavesTheResponseAsItIs) {
  EXPECT_EQ(Answer(Method<byItself>), R"({"error":{"code":103},"success":false})");
}

void failing() {
  throw Error{404};
}
int failingWithDetail() {
  throw Error{405, "taken"};
}
Result<int> returned(const Call& call) {
  if (call.Has("n")) {
    return 7;
  }
  return Error{406};
}
Result<void> done(const Call& call) {
  if (call.Has("n")) {
    return {};
  }
  return Error{407, Json::Value(1)};
}

TEST_F(MethodAnswers, ErrorsAreThrownOrReturned) {
  EXPECT_EQ(Answer(Method<failing>), R"({"error":{"code":404},"success":false})");
  EXPECT_EQ(Answer(Method<failingWithDetail>),
            R"({"error":{"code":405,"errors":"taken"},"success":false})");
  EXPECT_EQ(Answer(Method<returned>), R"({"error":{"code":406},"success":false})");
  EXPECT_EQ(Answer(Method<returned>, R"({"n":1})"), R"({"data":7,"success":true})");
  EXPECT_EQ(Answer(Method<done>), R"({"error":{"code":407,"errors":1},"success":false})");
  EXPECT_EQ(Answer(Method<done>, R"({"n":1})"), R"({"success":true})");
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(MethodAnswers, ErrorZeroIsNoSuccess) {
  ExpectNoAnswer(Method<[] { throw Error{0}; }>);
  EXPECT_EQ(SyslogCapture::Count("a method failed with code 0"), 1);
}

TEST_F(MethodAnswers, ExceptionsEndAsNoAnswerAndInTheLog) {
  ExpectNoAnswer(Method<[] { throw std::runtime_error("disk\ngone"); }>);
  EXPECT_EQ(SyslogCapture::Count("method threw an exception: disk?gone"), 1);
  ExpectNoAnswer(Method<[] { throw std::bad_alloc(); }>);
  EXPECT_EQ(SyslogCapture::Count("method threw an exception: std::bad_alloc"), 1);
  SyslogCapture::Clear();
  ExpectNoAnswer(Method<[] { throw 5; }>);
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_EQ(SyslogCapture::Messages()[0].text.rfind("Method.h:", 0), 0U);
}

TEST_F(MethodAnswers, ExceptionTakesASuccessBack) {
  ExpectNoAnswer(Method<[](Call& call) {
    call.Response().SetSuccess("half");
    throw std::runtime_error("late");
  }>);
}

TEST_F(MethodAnswers, LongTextOfAnExceptionIsCut) {
  ExpectNoAnswer(Method<[] { throw std::runtime_error(std::string(100000, 'x')); }>);
  EXPECT_LT(SyslogCapture::Messages().at(0).text.size(), 600U);
}

bool isWanted(const Call& call) {
  if (call.Has("strange")) {
    throw Error{408};
  }
  return call.Has("n");
}

TEST_F(MethodAnswers, ChecksPassRefuseOrThrow) {
  Ask(R"({"n":1})");
  EXPECT_EQ(Check<isWanted>(request.get(), response.get()), 1);
  EXPECT_EQ(response->GetError(), WEBAPI_ERR_NO_ANSWER);
  Ask("{}");
  response->SetError(WEBAPI_ERR_NOT_AUTHENTICATED);
  EXPECT_EQ(Check<isWanted>(request.get(), response.get()), 0);
  EXPECT_EQ(response->GetError(), WEBAPI_ERR_NOT_AUTHENTICATED);
  response->SetError(WEBAPI_ERR_NONE);
  EXPECT_EQ(Check<isWanted>(request.get(), response.get()), 0);
  EXPECT_EQ(response->GetError(), WEBAPI_ERR_NO_PERMISSION);
  Ask(R"({"n":1,"strange":1})");
  EXPECT_EQ(Check<isWanted>(request.get(), response.get()), 0);
  EXPECT_EQ(response->GetError(), 408);
}

TEST_F(MethodAnswers, TableOfOneVersionHasAnEnd) {
  const auto table =
      MethodTable("QELO.Test.Kit", 2, {{"number", Method<number>}, {"text", Method<text>}});
  ASSERT_EQ(table.size(), 3U);
  EXPECT_STREQ(table[1].api, "QELO.Test.Kit");
  EXPECT_EQ(table[1].version, 2);
  EXPECT_STREQ(table[1].method, "text");
  EXPECT_EQ(Answer(table[1].function), R"({"data":"ready","success":true})");
  EXPECT_EQ(table[2].api, nullptr);
}

Download report(const Call& call) {
  if (call.Has("path")) {
    return {.path = "/srv/a.txt", .type = "text/plain", .unreadable = 410};
  }
  return {.content = "a,b\n", .name = "book.csv"};
}

TEST_F(MethodAnswers, DownloadIsSent) {
  Answer(Method<report>, R"({"path":1})");
  EXPECT_FALSE(response->IsEnableOutput());
  EXPECT_EQ(FakePlatform::Get().calls.back(), "HTTPFileOutputer::Output(/srv/a.txt, text/plain)");
  Answer(Method<report>);
  EXPECT_FALSE(response->IsEnableOutput());
  EXPECT_EQ(FakePlatform::Get().calls.back(),
            "HTTPFileOutputer::Output(stream, , type/of-book.csv)");
}

TEST_F(MethodAnswers, DownloadThatWasSentIsASuccessForCallsFromCode) {
  EXPECT_EQ(Answer(Method<report>), R"({"success":true})");
  EXPECT_FALSE(response->IsEnableOutput());
}

TEST_F(MethodAnswers, DownloadThatCannotBeSentIsAnError) {
  FakePlatform::Get().fileOutput = -1;
  EXPECT_EQ(
      Answer(Method<report>, R"({"path":1})"),
      R"({"error":{"code":410,"errors":{"reason":"No such file or directory"}},"success":false})");
  EXPECT_TRUE(response->IsEnableOutput());
}

}  // namespace
}  // namespace QELO
