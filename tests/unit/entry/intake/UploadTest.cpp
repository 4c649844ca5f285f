// Uploads: whether the web entry reads one or leaves it to the method, and what becomes of it.

#include <algorithm>

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

constexpr char kTaken[] = R"({"allowUpload": true, "grantByDefault": true})";

class UploadIntake : public CgiTest {
 protected:
  void SetUp() override {
    CgiTest::SetUp();
    platform->upload.volume = directory;
  }
  CgiAnswer Upload(const std::string& attributes) {
    Describe(R"({"authLevel": 0})", attributes);
    Post("--x\r\nbody");
    Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
    Set("QUERY_STRING", "api=QELO.Test.Good&version=1&method=echo");
    return Serve();
  }
};

TEST_F(UploadIntake, MethodThatReadsItItselfFindsTheBodyUnread) {
  const CgiAnswer answer =
      Upload(R"({"allowUpload": true, "deferUpload": true, "grantByDefault": true})");
  EXPECT_TRUE(answer.Json()["success"].asBool());
  EXPECT_TRUE(answer.HasLine("Content-type: text/plain; charset=\"UTF-8\""));
  EXPECT_EQ(RestOfInput(), "--x\r\nbody");
  EXPECT_EQ(Calls("QeloCgiLoadUploadAll"), 0);
}

TEST_F(UploadIntake, FieldsAndFilesBecomeParameters) {
  platform->upload.parameters = {{"n", "5"}, {"f", "a.txt"}};
  platform->upload.files = {{"f", "/nonexistent/one"}};
  const CgiAnswer answer = Upload(kTaken);
  EXPECT_EQ(answer.Json()["data"],
            Parse(R"({"api": "QELO.Test.Good", "version": 1, "method": "echo", "n": 5,
                      "f": "/nonexistent/one"})"));
  EXPECT_EQ(platform->upload.directory, directory.string() + "/@tmp");
}

TEST_F(UploadIntake, FieldsThatNameAnotherCallLeaveTheOneThatWasChecked) {
  platform->upload.parameters = {{"api", "QELO.Other"}, {"version", "7"}, {"method", "fail"}};
  EXPECT_EQ(Upload(kTaken).Json()["data"],
            Parse(R"({"api": "QELO.Test.Good", "version": 1, "method": "echo"})"));
}

TEST_F(UploadIntake, EncipheredFieldsThatNameAnotherCallLeaveTheOneThatWasChecked) {
  platform->upload.parameters = {{"__cIpHeRtExT", "api=QELO.Other&method=fail&k=v"}};
  platform->decryptParam = [](char*) { return 1; };
  const Json::Value data = Upload(kTaken).Json()["data"];
  EXPECT_EQ(data["k"], "v");
  EXPECT_EQ(data["api"], "QELO.Test.Good");
}

TEST_F(UploadIntake, FilesAreRemovedWhenTheRequestEnds) {
  const std::string path = directory / "one";
  const std::string folder = directory / "folder";
  std::ofstream(path) << "content";
  std::filesystem::create_directory(folder);
  platform->upload.files = {{"f", path}, {"g", folder}};
  Upload(kTaken);
  EXPECT_FALSE(std::filesystem::exists(path));
  EXPECT_TRUE(std::filesystem::exists(folder));
}

TEST_F(UploadIntake, FilesOfALoadThatFailedAreRemovedToo) {
  const std::string path = directory / "one";
  std::ofstream(path) << "content";
  platform->upload.files = {{"f", path}};
  platform->upload.all = -7;
  EXPECT_EQ(Upload(kTaken).Json(),
            Parse(R"({"success": false, "error": {"code": 108, "errors": {"upload_err": -7}}})"));
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST_F(UploadIntake, FilesAreGivenToWhomTheMethodRunsAs) {
  platform->userGetUGID = [](const std::string& name, uid_t* uid, gid_t* gid) {
    *uid = name == "root" ? 0 : name == "system" ? 900 : name == "other" ? 901 : 1;
    *gid = *uid + 1000;
    return 0;
  };
  Upload(kTaken);
  EXPECT_EQ(platform->upload.owner, 0U);
  Upload(R"({"allowUpload": true})");
  EXPECT_EQ(platform->upload.owner, 900U);
  EXPECT_EQ(platform->upload.group, 1900U);
  Upload(R"({"allowUpload": true, "runAs": "other"})");
  EXPECT_EQ(platform->upload.owner, 901U);
}

TEST_F(UploadIntake, FilesForNobodyAreNotGivenAway) {
  platform->userGetUGID = [](const std::string&, uid_t*, gid_t*) { return -1; };
  Upload(kTaken);
  Upload(R"({"allowUpload": true, "grantByUser": true})");  // nobody is logged in
  EXPECT_EQ(platform->upload.owner, static_cast<uid_t>(-1));
}

TEST_F(UploadIntake, WithoutALengthSets108) {
  Describe(R"({"authLevel": 0})", kTaken);
  Set("REQUEST_METHOD", "POST");
  Set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  Set("QUERY_STRING", "api=QELO.Test.Good&version=1&method=echo");
  EXPECT_EQ(Serve().Json(),
            Parse(R"({"success": false, "error": {"code": 108, "errors": {"upload_err": -6}}})"));
}

TEST_F(UploadIntake, SliceOfAFileIsAnUpload) {
  Describe(R"({"authLevel": 0})", kTaken);
  Post("content");
  Set("HTTP_X_TYPE_NAME", "sliceupload");
  Set("QUERY_STRING", "api=QELO.Test.Good&version=1&method=echo");
  EXPECT_TRUE(Serve().Json()["success"].asBool());
  EXPECT_EQ(Calls("QeloCgiLoadUploadAll"), 1);
}

TEST_F(UploadIntake, PieceOfAResumableUploadIsNoParameterAndMayBeEmpty) {
  for (const std::string body : {"piece=1&of=2", ""}) {
    Describe(R"({"authLevel": 0})",
             R"({"allowUpload": true, "deferUpload": true, "grantByDefault": true})");
    Post(body);
    Set("CONTENT_TYPE", "application/offset+octet-stream");
    Set("HTTP_TUS_RESUMABLE", "1.0.0");
    Set("QUERY_STRING", "api=QELO.Test.Good&version=1&method=echo");
    const CgiAnswer answer = Serve();
    EXPECT_TRUE(answer.Json()["success"].asBool());
    EXPECT_TRUE(answer.Json()["data"]["piece"].isNull());
    EXPECT_EQ(RestOfInput(), body);
  }
}

TEST_F(UploadIntake, ResumableUploadThatNamesItsCallInTheBodyIsReadAsAnyOther) {
  Describe(R"({"authLevel": 0})", R"({"grantByDefault": true})");
  Post("api=QELO.Test.Good&version=1&method=echo");
  Set("HTTP_TUS_RESUMABLE", "1.0.0");
  EXPECT_TRUE(Serve().Json()["success"].asBool());
}

TEST_F(UploadIntake, FormOfAClientThatSpeaksOfResumableUploadsIsReadAsAnyOther) {
  Describe(R"({"authLevel": 0})", R"({"grantByDefault": true})");
  Post("a=1");
  Set("CONTENT_TYPE", "application/x-www-form-urlencoded");
  Set("HTTP_TUS_RESUMABLE", "1.0.0");
  Set("QUERY_STRING", "api=QELO.Test.Good&version=1&method=echo");
  const CgiAnswer answer = Serve();
  EXPECT_TRUE(answer.Json()["success"].asBool());
  EXPECT_EQ(answer.Json()["data"]["a"], 1);
}

TEST_F(UploadIntake, SliceAfterWhichMoreIsToComeIsAnsweredWithoutTheMethod) {
  platform->upload.all = 2;
  platform->upload.sliceReceived = 5'000'000'000;
  platform->upload.sliceSize = 6'000'000'000;
  EXPECT_EQ(Upload(kTaken).Json(),
            Parse(R"({"success": true, "data": {"received": 5000000000, "size": 6000000000}})"));
}

TEST_F(UploadIntake, SliceThatIsRefusedTellsHowMuchThereIs) {
  platform->upload.all = -10;
  platform->upload.sliceReceived = 7;
  platform->upload.sliceSize = 9;
  EXPECT_EQ(Upload(kTaken).Json(), Parse(R"({"success": false, "error": {"code": 108, "errors":
                      {"upload_err": -10, "received": 7, "size": 9}}})"));
}

TEST_F(UploadIntake, SliceIsItsCallers) {
  Upload(kTaken);
  EXPECT_EQ(platform->upload.caller, static_cast<uid_t>(-1));
  Set("HTTP_X_TYPE_NAME", "SLICEUPLOAD");
  Upload(kTaken);  // nobody is logged in
  EXPECT_EQ(platform->upload.caller, static_cast<uid_t>(-1));
  platform->authorized = 1;
  platform->authorizedUser = "alice";
  Set("HTTP_COOKIE", "id=S");
  Describe(R"({"authLevel": 1, "allowUser": ["normal.local"]})", kTaken);
  Post("--x\r\nbody");
  Serve();
  EXPECT_EQ(platform->upload.caller, 1000U);
  // Afterwards it is another request's to go on with.
  EXPECT_EQ(platform->calls.back(), "QeloCgiUploadCallerSet(-1)");
}

TEST_F(UploadIntake, SliceOfAMethodThatReadsItIsItsCallersToo) {
  platform->authorized = 1;
  platform->authorizedUser = "alice";
  Set("HTTP_COOKIE", "id=S");
  Set("HTTP_X_TYPE_NAME", "SLICEUPLOAD");
  Describe(R"({"authLevel": 1, "allowUser": ["normal.local"]})",
           R"({"allowUpload": true, "deferUpload": true, "grantByDefault": true})");
  Post("--x\r\nbody");
  Set("QUERY_STRING", "api=QELO.Test.Good&version=1&method=echo");
  Serve();
  EXPECT_EQ(platform->upload.caller, 1000U);
  EXPECT_EQ(std::ranges::count(platform->calls, "QeloCgiUploadCallerSet(-1)"), 1);
}

TEST_F(UploadIntake, UploadToAMethodThatTakesNoneSets115) {
  EXPECT_EQ(Upload(R"({"grantByDefault": true})").Code(), 115);
}

TEST_F(UploadIntake, NullRequestOrResponseFails) {
  TestEntry entry;
  EXPECT_FALSE(entry.HandleUpload(nullptr, entry.Response()));
  EXPECT_FALSE(entry.HandleUpload(entry.Request(), nullptr));
}

}  // namespace
}  // namespace QELO
