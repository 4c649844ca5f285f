// Parameters of a method whose description declares them, as clients send them.

#include "tests/support/CgiFixture.h"
#include "tests/support/FakeUpload.h"

namespace QELO {
namespace {

constexpr char kCall[] = "api=QELO.Test.Good&version=1&method=echo";
constexpr char kSchema[] = R"({"params": {"additionalProperties": false, "properties": {
    "phone": {"type": "string"}, "size": {"type": "integer", "minimum": 1, "default": 7},
    "ratio": {"type": "number"}, "maybe": {"type": ["string", "null", "boolean"]},
    "list": {"type": "array", "items": {"type": "string"}}, "free": {},
    "kind": {"enum": ["1", "2"]}}}})";

class DeclaredParameters : public CgiTest {
 protected:
  void SetUp() override {
    CgiTest::SetUp();
    Describe(R"({"authLevel": 0})", kSchema);
  }

  static Json::Value Answer(const std::string& parameters) {
    Get(std::string(kCall) + parameters);
    return Parse(Serve().Body());
  }
  /// What the method got.
  static Json::Value Got(const std::string& parameters) { return Answer(parameters)["data"]; }
  /// What was told to be wrong, "path rule" each.
  static std::vector<std::string> Wrong(const std::string& parameters) {
    const Json::Value answer = Answer(parameters);
    EXPECT_EQ(answer["error"]["code"], Json::Value(101)) << parameters;
    EXPECT_FALSE(answer.isMember("data"));
    std::vector<std::string> wrong;
    for (const Json::Value& fault : answer["error"]["errors"]) {
      EXPECT_TRUE(fault["message"].isString());
      EXPECT_EQ(fault.size(), 3U);
      wrong.push_back(fault["path"].asString() + " " + fault["rule"].asString());
    }
    return wrong;
  }
};

TEST_F(DeclaredParameters, ATextArrivesAsItWasSentWhateverItLooksLike) {
  for (const char* text : {"12345", "true", "null", "[1]", "{\"a\":1}", "1e5", "-0", "05", "\"x\"",
                           "\"", "", "x", "18446744073709551616", "0.10"}) {
    std::string sent;
    for (const char* c = text; *c != '\0'; ++c) {
      char escape[4];
      snprintf(escape, sizeof escape, "%%%02X", static_cast<unsigned char>(*c));
      sent += escape;
    }
    EXPECT_EQ(Got("&phone=" + sent)["phone"], Json::Value(text)) << text;
  }
  EXPECT_EQ(Got("&phone=+5+")["phone"], Json::Value(" 5 "));
  EXPECT_EQ(Got("&kind=2")["kind"], Json::Value("2")) << "declared by its values";
}

TEST_F(DeclaredParameters, OfTwoWithANameTheLastCountsAndABodyBeforeTheQuery) {
  EXPECT_EQ(Got("&phone=1&phone=2")["phone"], Json::Value("2"));
  Get(std::string(kCall) + "&phone=1");
  Post("phone=3&size=9");
  const Json::Value got = Parse(Serve().Body())["data"];
  EXPECT_EQ(got["phone"], Json::Value("3"));
  EXPECT_EQ(got["size"], Json::Value(9));
}

TEST_F(DeclaredParameters, OtherTypesAreReadAsEver) {
  const Json::Value got = Got("&size=5.0&ratio=0.300000000000000041&list=[\"5\"]&free=5");
  EXPECT_EQ(got["size"].type(), Json::intValue);
  EXPECT_EQ(got["size"], Json::Value(5));
  EXPECT_DOUBLE_EQ(got["ratio"].asDouble(), 0.3) << "a number whose digits a real does not keep";
  EXPECT_EQ(got["list"][0], Json::Value("5"));
  EXPECT_EQ(got["free"], Json::Value(5));
}

TEST_F(DeclaredParameters, WhereATextIsOneOfSeveralTypesJsonComesFirst) {
  EXPECT_TRUE(Got("&maybe=null")["maybe"].isNull());
  EXPECT_EQ(Got("&maybe=true")["maybe"], Json::Value(true));
  EXPECT_EQ(Got("&maybe=\"5\"")["maybe"], Json::Value("5"));
  EXPECT_EQ(Got("&maybe=5")["maybe"], Json::Value("5"));
  EXPECT_EQ(Got("&maybe=[1]")["maybe"], Json::Value("[1]"));
}

TEST_F(DeclaredParameters, DefaultsAreFilledIn) {
  EXPECT_EQ(Got("")["size"], Json::Value(7));
  EXPECT_EQ(Got("&size=8")["size"], Json::Value(8));
}

TEST_F(DeclaredParameters, EveryFieldThatIsWrongIsTold) {
  using Lines = std::vector<std::string>;
  EXPECT_EQ(Wrong("&size=0&ratio=x&list=[\"a\",5]&other=1"),
            (Lines{"/list/1 type", "/other additionalProperties", "/ratio type", "/size minimum"}));
  EXPECT_EQ(Wrong("&size=\"5\""), Lines{"/size type"});
  EXPECT_EQ(Wrong("&kind=3"), Lines{"/kind enum"});
}

TEST_F(DeclaredParameters, TheFrameworksOwnAreNoneOfThem) {
  const Json::Value got = Got("&tid=&_sid=x&_own=1&client_time=5");
  EXPECT_EQ(got["_own"], Json::Value(1)) << "they are there all the same";
  EXPECT_EQ(got["version"], Json::Value(1));
}

TEST_F(DeclaredParameters, AreAskedOfCallersWhoMayCall) {
  Describe(R"({"authLevel": 1})", kSchema);
  EXPECT_EQ(Answer("&size=0")["error"]["code"], Json::Value(105));
}

TEST_F(DeclaredParameters, AMethodWithoutThemIsCalledWithoutASchemaBeingRead) {
  Describe(R"({"authLevel": 0})");
  EXPECT_EQ(Got("&phone=5")["phone"], Json::Value(5));
  EXPECT_EQ(Calls("Schema::Apply"), 0);
}

TEST_F(DeclaredParameters, FieldsOfAnUploadAreDeclaredToo) {
  Describe(R"({"authLevel": 0})", R"({"allowUpload": true, "params": {"properties": {
      "phone": {"type": "string"}, "size": {"type": "integer"}}}})");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  platform->upload.parameters = {{"phone", "12345"}, {"size", "5"}};
  Get(kCall);
  Set("REQUEST_METHOD", "POST");
  Set("CONTENT_LENGTH", "10");
  Json::Value got = Parse(Serve().Body())["data"];
  EXPECT_EQ(got["phone"], Json::Value("12345"));
  EXPECT_EQ(got["size"], Json::Value(5));
  platform->upload.parameters = {{"size", "many"}};
  got = Parse(Serve().Body())["error"];
  EXPECT_EQ(got["errors"][0]["path"], Json::Value("/size"));
}

TEST_F(DeclaredParameters, EnvelopesAreReadAsTheLinesInThem) {
  platform->aesKeyResult = 0;
  platform->decryptAES = [](const std::string&, const std::string& text, std::string& plain) {
    plain = text == "cipher" ? "phone=777&size=3" : "";
    return true;
  };
  Json::Value got = Got("&phone=1&__nEkOtReHpIc=t&__tXeTrEhPiC=cipher");
  EXPECT_EQ(got["phone"], Json::Value("777"));
  EXPECT_EQ(got["size"], Json::Value(3));
}

}  // namespace
}  // namespace QELO
