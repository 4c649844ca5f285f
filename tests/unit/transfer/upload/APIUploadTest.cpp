// What APIUpload makes of what the loaders give.

#include <fstream>
#include <vector>

#include "tests/unit/transfer/upload/Fixture.h"

namespace QELO {
namespace {

class WholeUpload : public UploadTest {};
class DeferredUpload : public UploadTest {
 protected:
  void FindFile() {
    fake.part = "Content-Disposition: ...";
    fake.field = "f";
    fake.name = "a.txt";
    fake.left = 500;
  }
};

TEST_F(WholeUpload, NeedsAContentLength) {
  for (const char* length : {"0", "", "x", "-5"}) {
    APIRequest empty(Environment(length));
    EXPECT_EQ(APIUpload(&empty).GetUploadAll(params, &files), -6) << length;
  }
  APIRequest without;
  EXPECT_EQ(APIUpload(&without).GetUploadAll(params, &files), -6);
  EXPECT_EQ(APIUpload(nullptr).GetUploadAll(params, &files), -6);
  EXPECT_TRUE(platform.calls.empty());
}

TEST_F(WholeUpload, NeedsRoomForItsLengthAnd5MiB) {
  host.freeBytes[Paths::kRoot] = 0;
  host.freeBytes[Paths::kTmp] = 1000 + kMargin - 1;
  EXPECT_EQ(APIUpload(&request).GetUploadAll(params, &files), -2);
  host.freeBytes[Paths::kTmp] += 1;
  EXPECT_EQ(APIUpload(&request).GetUploadAll(params, &files), 1);
  EXPECT_EQ(fake.directory, Paths::kTmp);
}

TEST_F(WholeUpload, LengthBeyond32BitsIsTaken) {
  APIRequest large(Environment("5368709120"));
  host.freeBytes[Paths::kTmp] = 5368709120 + kMargin;
  EXPECT_EQ(APIUpload(&large).GetUploadAll(params, &files), 1);
}

TEST_F(WholeUpload, LengthBeyondAnyDiskHasNoRoom) {
  APIRequest vast(Environment("18446744073709551615"));
  EXPECT_EQ(APIUpload(&vast).GetUploadAll(params, &files), -2);
}

TEST_F(WholeUpload, SliceNeedsRoomForTheRestOfItsFile) {
  Json::Value record = Environment("1000");
  record["environ"]["HTTP_X_TYPE_NAME"] = "SLICEUPLOAD";
  record["environ"]["HTTP_X_FILE_SIZE"] = "9000";
  record["environ"]["HTTP_X_SLICE_OFFSET"] = "2000";
  APIRequest slice(record);
  host.freeBytes[Paths::kRoot] = 0;
  host.freeBytes[Paths::kTmp] = 7000 + kMargin - 1;
  EXPECT_EQ(APIUpload(&slice).GetUploadAll(params, &files), -2);
  host.freeBytes[Paths::kTmp] += 1;
  EXPECT_EQ(APIUpload(&slice).GetUploadAll(params, &files), 1);
  record["environ"]["HTTP_X_SLICE_OFFSET"] = "9001";
  APIRequest beyond(record);
  host.freeBytes[Paths::kTmp] = 1000 + kMargin;
  EXPECT_EQ(APIUpload(&beyond).GetUploadAll(params, &files), 1);
}

TEST_F(WholeUpload, WithoutMemoryForAHashIsLogged) {
  for (const int hashes : {0, 1}) {
    SyslogCapture::Clear();
    host.hashesLeft = hashes;
    EXPECT_EQ(APIUpload(&request).GetUploadAll(params, &files), -9);
    ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
    EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
    EXPECT_EQ(SyslogCapture::Messages()[0].text.rfind("APIUpload.cpp:", 0), 0U);
    EXPECT_EQ(SyslogCapture::Count(" cannot alloc memory for hash!"), 1);
  }
  EXPECT_EQ(CountCalls("QeloCgiLoadUploadAll"), 0);
}

TEST_F(WholeUpload, LoaderThatRunsShortOfMemoryLeavesNoHash) {
  fake.parameters = {{"n", std::string(1000, 'x')}};
  fake.files = {{"f", "/tmp/one"}};
  fake.runsShort = true;
  EXPECT_EQ(APIUpload(&request).GetUploadAll(params, &files), -9);
  EXPECT_TRUE(params.empty());
  EXPECT_EQ(SyslogCapture::Count(" cannot alloc memory for hash!"), 1);
}

TEST_F(WholeUpload, FilesComeAfterParametersOfTheSameName) {
  fake.parameters = {{"n", "5"}, {"f", "a.txt"}, {"t", "text"}};
  fake.files = {{"f", "/tmp/one"}};
  EXPECT_EQ(APIUpload(&request).GetUploadAll(params, &files), 1);
  EXPECT_EQ(params, Parse(R"({"n": 5, "f": "/tmp/one", "t": "text"})"));
  EXPECT_EQ(files, Parse(R"(["/tmp/one"])"));
}

TEST_F(WholeUpload, FilesThatALoadLeftBehindAreListedWhateverItsResult) {
  files.append("before");
  fake.files = {{"f", "/tmp/one"}, {"", "/tmp/nameless"}, {"g", ""}};
  fake.all = -7;
  EXPECT_EQ(APIUpload(&request).GetUploadAll(params, &files), -7);
  EXPECT_EQ(files, Parse(R"(["before", "/tmp/one"])"));
  EXPECT_TRUE(params.empty());
  EXPECT_EQ(APIUpload(&request).GetFiles().size(), 0U);
}

TEST_F(WholeUpload, NobodyNeedsTheListOfFiles) {
  fake.files = {{"f", "/tmp/one"}};
  EXPECT_EQ(APIUpload(&request).GetUploadAll(params, nullptr), 1);
  EXPECT_EQ(params, Parse(R"({"f": "/tmp/one"})"));
}

TEST_F(WholeUpload, WhatCannotBeConvertedIsLogged) {
  std::string many = "[0";
  for (int i = 0; i < 50'000; ++i) {
    many += ",0";
  }
  fake.parameters = {{"many", many + "]"}};
  fake.files = {{"f", "/tmp/one"}};
  EXPECT_EQ(APIUpload(&request).GetUploadAll(params, &files), -9);
  EXPECT_EQ(SyslogCapture::Count(" cannot convert hash to Json object!"), 1);
  EXPECT_EQ(files.size(), 1U);
  Json::Value text = "no object";
  fake.parameters.clear();
  EXPECT_EQ(APIUpload(&request).GetUploadAll(text, &files), -9);
  EXPECT_EQ(text, "no object");
}

TEST_F(WholeUpload, FilesTellWhatNoParameterCanPretend) {
  const std::string path = testing::TempDir() + "uploaded";
  std::ofstream(path) << "12345";
  fake.parameters = {{"f", "a.txt"}, {"g", "/etc/shadow"}};
  fake.files = {{"f", path}};
  APIUpload upload(&request);
  EXPECT_EQ(upload.GetUploadAll(params, nullptr), 1);
  Json::Value expected = Parse(R"([{"field": "f", "name": "a.txt", "size": 5}])");
  expected[0]["path"] = path;
  EXPECT_EQ(JsonHelper::toString(upload.GetFiles()), JsonHelper::toString(expected));
  EXPECT_EQ(APIUpload(&request).GetFiles().size(), 1U);
  std::remove(path.c_str());
}

TEST_F(DeferredUpload, BuffersHaveTheirSizes) {
  APIUpload(&request).GetUploadParam(params);
  EXPECT_EQ(platform.calls.back(), "QeloCgiLoadUploadParams(256, 64, 491)");
}

TEST_F(DeferredUpload, FieldsAndTheNameOfTheFileThatFollows) {
  fake.parameters = {{"n", "5"}, {"f", "other"}};
  FindFile();
  APIUpload upload(&request);
  EXPECT_FALSE(upload.HasFile());
  EXPECT_EQ(upload.GetUploadParam(params), 1);
  EXPECT_EQ(params, Parse(R"({"n": 5, "f": "a.txt"})"));
  EXPECT_TRUE(upload.HasFile());
  EXPECT_EQ(upload.GetFileField(), "f");
  EXPECT_EQ(upload.GetFileName(), "a.txt");
}

TEST_F(DeferredUpload, NameOfAFileStaysAText) {
  FindFile();
  fake.name = "[1]";
  EXPECT_EQ(APIUpload(&request).GetUploadParam(params), 1);
  EXPECT_EQ(params, Parse(R"({"f": "[1]"})"));
}

TEST_F(DeferredUpload, NameOfAFileWithoutItsHeaderIsToldAndTheFileIsNone) {
  FindFile();
  fake.part = "";
  APIUpload upload(&request);
  EXPECT_EQ(upload.GetUploadParam(params), 1);
  EXPECT_EQ(params, Parse(R"({"f": "a.txt"})"));
  EXPECT_EQ(upload.GetUploadFile(params), -8);
}

TEST_F(DeferredUpload, NoFileFollowsWithoutFieldOrName) {
  for (std::string FakeUpload::*missing :
       {&FakeUpload::part, &FakeUpload::field, &FakeUpload::name}) {
    FindFile();
    fake.*missing = "";
    APIUpload upload(&request);
    params = Json::Value(Json::objectValue);
    EXPECT_EQ(upload.GetUploadParam(params), 1);
    EXPECT_FALSE(upload.HasFile());
    EXPECT_EQ(upload.GetFileField(), "");
    EXPECT_EQ(upload.GetFileName(), "");
    EXPECT_EQ(upload.GetUploadFile(params), -8);
  }
  EXPECT_EQ(CountCalls("QeloCgiLoadUploadFileToDir"), 0);
}

TEST_F(DeferredUpload, FailedLoaderLeavesTheParameters) {
  fake.parameters = {{"n", "5"}};
  FindFile();
  fake.params = -3;
  EXPECT_EQ(APIUpload(&request).GetUploadParam(params), -3);
  EXPECT_TRUE(params.empty());
}

TEST_F(DeferredUpload, WithoutMemoryForTheHashIsLogged) {
  host.hashesLeft = 0;
  EXPECT_EQ(APIUpload(&request).GetUploadParam(params), -9);
  EXPECT_EQ(SyslogCapture::Count(" cannot alloc memory for hash!"), 1);
}

TEST_F(DeferredUpload, WithoutARequestNothingIsLeft) {
  EXPECT_EQ(APIUpload(nullptr).GetUploadParam(params), -6);
  EXPECT_EQ(APIUpload(nullptr).GetUploadFile(params), -8);
}

TEST_F(DeferredUpload, FileWithoutFieldsBeforeItIsNone) {
  EXPECT_EQ(APIUpload(&request).GetUploadFile(params), -8);
}

TEST_F(DeferredUpload, FileOfWhichNothingIsLeft) {
  FindFile();
  fake.left = 0;
  APIUpload upload(&request);
  EXPECT_EQ(upload.GetUploadParam(params), 1);
  EXPECT_EQ(upload.GetUploadFile(params), -6);
}

TEST_F(DeferredUpload, FileNeedsRoomForWhatIsLeftAnd5MiB) {
  FindFile();
  host.freeBytes[Paths::kRoot] = 0;
  host.freeBytes[Paths::kTmp] = 500 + kMargin - 1;
  APIUpload upload(&request);
  EXPECT_EQ(upload.GetUploadParam(params), 1);
  EXPECT_EQ(upload.GetUploadFile(params), -2);
  host.freeBytes[Paths::kTmp] += 1;
  EXPECT_EQ(upload.GetUploadFile(params), 1);
  EXPECT_EQ(fake.directory, Paths::kTmp);
}

TEST_F(DeferredUpload, FileTakesThePlaceOfItsNameAndIsListed) {
  FindFile();
  fake.files = {{"f", "/tmp/one"}};
  APIUpload upload(&request);
  EXPECT_EQ(upload.GetUploadParam(params), 1);
  EXPECT_EQ(upload.GetUploadFile(params), 1);
  EXPECT_EQ(params, Parse(R"({"f": "/tmp/one"})"));
  EXPECT_FALSE(upload.HasFile());
  EXPECT_EQ(upload.GetUploadFile(params), -8);
  EXPECT_EQ(JsonHelper::toString(upload.GetFiles()),
            R"([{"field":"f","name":"a.txt","path":"/tmp/one","size":0}])");
}

TEST_F(DeferredUpload, FileThatFailsLeavesTheParameters) {
  FindFile();
  fake.files = {{"f", "/tmp/one"}};
  fake.file = -7;
  APIUpload upload(&request);
  EXPECT_EQ(upload.GetUploadParam(params), 1);
  EXPECT_EQ(upload.GetUploadFile(params), -7);
  EXPECT_EQ(params, Parse(R"({"f": "a.txt"})"));
  EXPECT_EQ(upload.GetFiles().size(), 0U);
}

std::vector<unsigned long long>& progress() {
  static std::vector<unsigned long long> calls;
  return calls;
}

TEST_F(DeferredUpload, ProgressIsToldToTheCallback) {
  FindFile();
  fake.callsBack = true;
  APIUpload upload(&request);
  upload.GetUploadParam(params);
  EXPECT_TRUE(progress().empty());
  upload.SetUploadCallback([](unsigned long long done, unsigned long long total) {
    progress().insert(progress().end(), {done, total});
  });
  upload.GetUploadParam(params);
  upload.GetUploadFile(params);
  EXPECT_EQ(progress(), (std::vector<unsigned long long>{1, 2, 1, 2}));
}

TEST_F(DeferredUpload, RecordChangedInPlaceListsNoFiles) {
  request.Serialize()["attr"] = "text";
  FindFile();
  APIUpload upload(&request);
  upload.GetUploadParam(params);
  EXPECT_EQ(upload.GetUploadFile(params), 1);
  EXPECT_EQ(upload.GetFiles(), Json::Value(Json::arrayValue));
}

}  // namespace
}  // namespace QELO
