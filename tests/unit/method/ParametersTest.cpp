// How parameters become a struct, and what is said of those that do not.

#include <cstdint>

#include "tests/unit/method/Fixture.h"
#include "webapi/APIValidator.h"

namespace QELO {
namespace {

class MethodParameters : public MethodTest {};

struct Simple {
  std::string name;
  int limit = 50;
  bool deep = false;
  double share = 0.5;
  static constexpr auto Fields() {
    return QELO::Fields(Required("name", &Simple::name).Length(2, 4),
                        Optional("limit", &Simple::limit).Between(1, 500),
                        Optional("deep", &Simple::deep),
                        Optional("share", &Simple::share).Between(0, 1));
  }
};

Simple echo(const Simple& simple) {
  return simple;
}

TEST_F(MethodParameters, GoodOnesArriveAndDefaultsStay) {
  EXPECT_EQ(Answer(Method<echo>, R"({"name":"Ann","limit":7,"deep":true})"),
            R"({"data":{"deep":true,"limit":7,"name":"Ann","share":0.5},"success":true})");
}

TEST_F(MethodParameters, MissingOneIsNamed) {
  EXPECT_EQ(Answer(Method<echo>), R"({"error":{"code":101,"errors":[{"message":"is missing",)"
                                  R"("path":"/name","rule":"required"}]},"success":false})");
}

TEST_F(MethodParameters, EachWrongOneIsNamed) {
  EXPECT_EQ(Faults(Method<echo>, R"({"name":null,"limit":0,"deep":1,"share":2})"),
            "/name type, /limit minimum, /deep type, /share maximum");
}

TEST_F(MethodParameters, BoundsAreIncluded) {
  for (const char* params :
       {R"({"name":"ab","limit":1,"share":0})", R"({"name":"abcd","limit":500,"share":1.0})"}) {
    EXPECT_EQ(Faults(Method<echo>, params), "") << params;
  }
  EXPECT_EQ(Faults(Method<echo>, R"({"name":"a","limit":501,"share":-0.1})"),
            "/name minLength, /limit maximum, /share minimum");
  EXPECT_EQ(Faults(Method<echo>, R"({"name":"abcde"})"), "/name maxLength");
}

TEST_F(MethodParameters, LengthIsThatOfCharacters) {
  EXPECT_EQ(Faults(Method<echo>, R"({"name":"äöüß"})"), "");
  EXPECT_EQ(Faults(Method<echo>, R"({"name":"ä"})"), "/name minLength");
}

TEST_F(MethodParameters, IntegerIsNoOtherNumber) {
  for (const char* limit : {"1.5", "1e300", "2147483648", "-2147483649", "\"5\"", "[5]", "true"}) {
    EXPECT_EQ(Faults(Method<echo>, R"({"name":"Ann","limit":)" + std::string(limit) + "}"),
              "/limit type")
        << limit;
  }
}

struct Numbers {
  int8_t small = 0;
  unsigned int natural = 0;
  long long large = 0;
  unsigned long long largest = 0;
  static constexpr auto Fields() {
    return QELO::Fields(Optional("small", &Numbers::small), Optional("natural", &Numbers::natural),
                        Optional("large", &Numbers::large), Optional("largest", &Numbers::largest));
  }
};

Numbers numbers(Numbers given) {
  return given;
}

TEST_F(MethodParameters, IntegersHaveTheRangeOfTheirType) {
  EXPECT_EQ(
      Answer(Method<numbers>, R"({"small":-128,"natural":4294967295,)"
                              R"("large":-9223372036854775808,"largest":18446744073709551615})"),
      R"({"data":{"large":-9223372036854775808,"largest":18446744073709551615,)"
      R"("natural":4294967295,"small":-128},"success":true})");
  EXPECT_EQ(Faults(Method<numbers>, R"({"small":128,"natural":-1,)"
                                    R"("large":9223372036854775808,"largest":-1})"),
            "/small type, /natural type, /large type, /largest type");
}

std::string nameOf(const Simple& simple) {
  return simple.name;
}

TEST_F(MethodParameters, TextThatLooksLikeJsonIsATextAgain) {
  for (const char* text : {"1234", "-17", "true", "1.5"}) {
    EXPECT_EQ(Answer(Method<nameOf>, R"({"name":)" + std::string(text) + "}"),
              R"({"data":")" + std::string(text) + R"(","success":true})");
  }
}

TEST_F(MethodParameters, TextThatCannotBeToldFromJsonIsRefused) {
  for (const char* value : {"null", "[1]", R"({"a":1})"}) {
    EXPECT_EQ(Faults(Method<nameOf>, R"({"name":)" + std::string(value) + "}"), "/name type");
  }
}

struct Person {
  std::optional<std::string> phone = "none";
  std::vector<std::string> tags;
  Json::Value extra = {};
  static constexpr auto Fields() {
    return QELO::Fields(Optional("phone", &Person::phone).Length(1, 5),
                        Optional("tags", &Person::tags).Count(1, 3),
                        Optional("extra", &Person::extra));
  }
};

struct Team {
  Person head;
  std::vector<Person> others;
  static constexpr auto Fields() {
    return QELO::Fields(Required("head", &Team::head), Optional("others", &Team::others));
  }
};

Person person(const Person& given) {
  return given;
}
Team team(const Team& given) {
  return given;
}

TEST_F(MethodParameters, OptionalIsTakenAwayByNullAndKeptByNothing) {
  EXPECT_EQ(Answer(Method<person>, R"({"phone":null,"extra":null})"),
            R"({"data":{"extra":null,"phone":null,"tags":[]},"success":true})");
  EXPECT_EQ(Answer(Method<person>, R"({"extra":{"a":[1]}})"),
            R"({"data":{"extra":{"a":[1]},"phone":"none","tags":[]},"success":true})");
  EXPECT_EQ(Faults(Method<person>, R"({"phone":"123456"})"), "/phone maxLength");
}

TEST_F(MethodParameters, ListsAreCountedAndTheirValuesRead) {
  EXPECT_EQ(Faults(Method<person>, R"({"tags":["a",7,"c"]})"), "");
  EXPECT_EQ(Faults(Method<person>, R"({"tags":[]})"), "/tags minItems");
  EXPECT_EQ(Faults(Method<person>, R"({"tags":["a","b","c","d"]})"), "/tags maxItems");
  EXPECT_EQ(Faults(Method<person>, R"({"tags":"a"})"), "/tags type");
  EXPECT_EQ(Faults(Method<person>, R"({"tags":["a",null,{}]})"), "/tags/1 type, /tags/2 type");
}

TEST_F(MethodParameters, StructsStandInStructs) {
  EXPECT_EQ(Faults(Method<team>, R"({"head":{},"others":[{},{"phone":"123456"},5]})"),
            "/others/1/phone maxLength, /others/2 type");
  EXPECT_EQ(Faults(Method<team>, R"({"head":"ann"})"), "/head type");
}

TEST_F(MethodParameters, HugeListsTellSomeFaultsAlone) {
  Json::Value params(Json::objectValue);
  for (int i = 0; i < 1000; ++i) {
    params["tags"].append(Json::Value());
  }
  Answer(Method<person>, JsonHelper::toString(params));
  EXPECT_EQ(response->GetBody()["error"]["errors"].size(), method::Faults::kMost);
}

struct Choice {
  std::string order = "name";
  std::string mail = "a@example.net";
  int port = 80;
  static constexpr auto Fields() {
    return QELO::Fields(
        Optional("order", &Choice::order).OneOf("name", "size", "time"),
        Optional("mail", &Choice::mail).Check(APIValidator::IsEMail, "a mail address"),
        Optional("port", &Choice::port).Check(APIValidator::IsPort, "a port"));
  }
};

struct Line {
  std::string text;
  static constexpr auto Fields() { return QELO::Fields(Required("text", &Line::text).Line(1, 5)); }
};

TEST_F(MethodParameters, LineHasNoControlCharacters) {
  const Function method = Method<[](const Line&) {}>;
  EXPECT_EQ(Faults(method, R"({"text":"ä b"})"), "");
  EXPECT_EQ(Faults(method, R"({"text":""})"), "/text minLength");
  for (const char* text : {R"(a\tb)", R"(a\n)", R"(\u0000)", R"(\u007f)"}) {
    EXPECT_EQ(Faults(method, R"({"text":")" + std::string(text) + "\"}"), "/text pattern") << text;
  }
}

void choose(const Choice&) {}

TEST_F(MethodParameters, WordsAndChecksDecide) {
  EXPECT_EQ(Faults(Method<choose>, R"({"order":"time","mail":"b@example.net","port":65535})"), "");
  EXPECT_EQ(Faults(Method<choose>, R"({"order":"Time","mail":"b","port":65536})"),
            "/order enum, /mail format, /port format");
  Answer(Method<choose>, R"({"order":""})");
  EXPECT_EQ(response->GetBody()["error"]["errors"][0]["message"], "wants one of: name, size, time");
}

struct Import {
  UploadedFile file;
  std::optional<UploadedFile> picture;
  std::vector<UploadedFile> more;
  static constexpr auto Fields() {
    return QELO::Fields(Required("file", &Import::file).Length(1, 10),
                        Optional("picture", &Import::picture).Length(0, 3),
                        Optional("more", &Import::more).Count(0, 2));
  }
};

std::string filesOf(const Import& import) {
  std::string all = import.file.name + "=" + import.file.path + "," +
                    std::to_string(import.file.size) + (import.picture ? " and a picture" : "");
  for (const UploadedFile& file : import.more) {
    all += " " + file.name;
  }
  return all;
}

/// A method with the files of an upload.
template <auto kFunction>
void withFiles(APIRequest* request, APIResponse* response) {
  Json::Value files = request->GetParam("files");
  request->SetAttr("_upload_files", files);
  Method<kFunction>(request, response);
}

TEST_F(MethodParameters, UploadedFilesArrive) {
  EXPECT_EQ(Answer(withFiles<filesOf>,
                   R"({"files":[{"field":"more","name":"1","path":"/t/1","size":1},
                                {"field":"file","name":"a.csv","path":"/t/a","size":9},
                                {"field":"more","name":"2","path":"/t/2","size":2}]})"),
            R"({"data":"a.csv=/t/a,9 1 2","success":true})");
  EXPECT_EQ(Faults(withFiles<filesOf>, R"({"files":[{"field":"more"},{"field":"more"},
                                                    {"field":"more"}]})"),
            "/file required, /more maxItems");
  EXPECT_EQ(Faults(withFiles<filesOf>, R"({"files":[{"field":"file","size":11},
                                                    {"field":"picture","size":4}]})"),
            "/file maxLength, /picture maxLength");
  EXPECT_EQ(Faults(withFiles<filesOf>, R"({"files":[{"field":"file","size":0}]})"),
            "/file minLength");
}

TEST_F(MethodParameters, ParameterIsNoUploadedFile) {
  EXPECT_EQ(Faults(Method<filesOf>, R"({"file":"/etc/passwd"})"), "/file required");
  EXPECT_EQ(Faults(Method<filesOf>, R"({"file":{"name":"a","path":"/etc/passwd","size":1}})"),
            "/file required");
}

}  // namespace
}  // namespace QELO
