#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/FakePlatform.h"
#include "tests/unit/model/request/Fixture.h"
#include "webapi/APIResponse.h"

using namespace QELO;

// A record may arrive broken from another process. Whatever it holds, no accessor throws.

namespace {

const char* const kWrongValues[] = {"null", "true", "7",  "1e300",       "\"text\"",
                                    "[]",   "[1]",  "{}", R"({"a":{}})", "-1"};

/// Everything that a request can be asked and told.
void useEverything(APIRequest& request) {
  answers(request);
  request.GetAndCheckInt("x", APIRequest::PARAM_OPTIONAL);
  request.GetAndCheckUnitArray("x");
  request.SetAttr("a", 1);
  request.SetCookie("id", "x");
  request.SetAuthResult(AUTHORIZED_YES);
  request.InitParam(fullRequest(), true);
  request.InitAPIInfo(fullRequest()["reqLib"]);
  request.InitSession(fullRequest()["session"]);
  request.InitEnv(fullRequest()["environ"]);
  answers(request);
  request.GetQeloAccessTokenID();
}

void useEverything(APIResponse& response) {
  response.GetError();
  response.GetBody();
  response.GetHeaders();
  response.GetCookies();
  response.GetStatus();
  response.IsEnableOutput();
  response.GetHttpdRestart();
  response.GetServerError();
  response.HasServerError();
  response.SetHeader("a", "b");
  response.AddCookie("id", "x");
  response.SetStatus(HTTP_STATUS_OK);
  response.Redirect("/x");
  response.SetEnableOutput(false);
  response.SetHttpdRestart(true);
  response.SetServerError("x");
  response.SetError(117, "x");
}

/// Records with one wrong value each: as the whole, as a section, as a key of a section.
std::vector<Json::Value> brokenRecords(const Json::Value& good) {
  std::vector<Json::Value> records;
  for (const char* text : kWrongValues) {
    const Json::Value wrong = json(text);
    records.push_back(wrong);
    for (const std::string& section : good.getMemberNames()) {
      Json::Value record = good;
      record[section] = wrong;
      records.push_back(record);
      if (!good[section].isObject()) {
        continue;
      }
      for (const std::string& key : good[section].getMemberNames()) {
        record = good;
        record[section][key] = wrong;
        records.push_back(record);
      }
    }
  }
  return records;
}

}  // namespace

TEST(ForeignRequest, NeverThrowsWhateverItHolds) {
  FakePlatform::Reset();
  APIRequest full(fullRequest());
  answers(full);  // fills what is computed on the first query
  for (const Json::Value& broken : brokenRecords(full.Serialize())) {
    APIRequest request;
    Json::Value record = broken;
    EXPECT_NO_THROW({
      request.Deserialize(record);
      useEverything(request);
    }) << JsonHelper::toString(broken);
  }
}

TEST(ForeignRequest, ThatIsNoObjectAnswersLikeAnEmptyOne) {
  FakePlatform::Reset();
  for (const char* text : {"[]", "7", "\"text\"", "null"}) {
    APIRequest request;
    Json::Value record = json(text);
    request.Deserialize(record);
    EXPECT_FALSE(request.IsAuthorized());
    EXPECT_TRUE(request.IsTimeout());
    EXPECT_EQ(request.GetLoginUID(), 0xFFFFFFFF);
    EXPECT_EQ(request.GetAPIClass(), "");
    EXPECT_EQ(request.GetURLHost("default"), "default");
  }
}

TEST(ForeignResponse, NeverThrowsWhateverItHolds) {
  APIRequest request(fullRequest());
  APIResponse full(&request);
  full.SetStatus(HTTP_STATUS_OK, "fine");
  full.SetEnableOutput(true);
  full.SetHttpdRestart(false);
  full.AddCookie("id", "x");
  full.SetError(400, "x");
  for (const Json::Value& broken : brokenRecords(full.Serialize())) {
    APIResponse response(&request);
    Json::Value record = broken;
    EXPECT_NO_THROW({
      response.Deserialize(record);
      useEverything(response);
    }) << JsonHelper::toString(broken);
  }
}

TEST(ForeignResponse, CanStillBeGivenAnError) {
  for (const char* text : kWrongValues) {
    APIResponse response(nullptr);
    Json::Value record = json(text);
    response.Deserialize(record);
    response.SetError(117);
    EXPECT_EQ(response.GetError(), 117) << text;
    EXPECT_EQ(response.GetBody(), json(R"({"success":false,"error":{"code":117}})")) << text;
  }
}
