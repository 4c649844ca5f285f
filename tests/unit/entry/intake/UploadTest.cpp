// Uploads: whether the web entry reads one or leaves it to the method.

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

class UploadIntake : public CgiTest {
 protected:
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
}

TEST_F(UploadIntake, UploadThatCannotBeReadSets108) {
  const CgiAnswer answer = Upload(R"({"allowUpload": true, "grantByDefault": true})");
  EXPECT_EQ(answer.Json(),
            Parse(R"({"success": false, "error": {"code": 108, "errors": {"upload_err": -9}}})"));
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
