#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/support/FakePlatform.h"
#include "tests/unit/model/request/Fixture.h"

using namespace QELO;

namespace {

Json::Value sharingEnv(const std::string& id) {
  Json::Value init;
  init["environ"][SZ_X_SHARING_HEADER] = id;
  init["environ"]["HTTP_COOKIE"] = std::string(sharing::SZK_SHARING_SID) + "=visitor";
  return init;
}

}  // namespace

TEST(RequestSharing, TakesIdFromTheHeaderAndSessionFromTheCookie) {
  FakePlatform::Reset();
  const APIRequest request(sharingEnv("link"));
  EXPECT_TRUE(request.IsSharing());
  EXPECT_EQ(request.GetSharingID(), "link");
  EXPECT_EQ(request.GetSharingSID(), "visitor");
}

TEST(RequestSharing, IsOffWithoutTheHeader) {
  FakePlatform::Reset().sharingGood = true;
  const APIRequest request(sharingEnv(""));
  EXPECT_FALSE(request.IsSharing());
  EXPECT_EQ(request.GetSharingSID(), "visitor");
  EXPECT_TRUE(FakePlatform::Get().calls.empty());
}

TEST(RequestSharing, LooksUpLinkSessionAndTokenInThisOrder) {
  FakePlatform::Reset().sharingGood = true;
  const APIRequest request(sharingEnv("link"));
  EXPECT_EQ(
      FakePlatform::Get().calls,
      (std::vector<std::string>{"EntryDB::GetByHash(link)", "SessionDB::GetBySessionId(visitor)",
                                "TokenDB::GetBySessionEntry()"}));
}

TEST(RequestSharing, LooksNothingUpInABrokenDatabase) {
  FakePlatform::Reset().sharingGood = false;
  const APIRequest request(sharingEnv("link"));
  EXPECT_TRUE(request.IsSharing());
  EXPECT_TRUE(FakePlatform::Get().calls.empty());
}

TEST(RequestSharing, IsTakenAnewFromADeserializedRecord) {
  FakePlatform::Reset().sharingGood = true;
  APIRequest request;
  Json::Value record = APIRequest(sharingEnv("link")).Serialize();
  FakePlatform::Get().calls.clear();
  request.Deserialize(record);
  EXPECT_EQ(request.GetSharingID(), "link");
  EXPECT_EQ(request.GetSharingSID(), "visitor");
  EXPECT_EQ(FakePlatform::Get().calls.size(), 3u);
  request.Deserialize(record);
  EXPECT_FALSE(request.IsSharing());
  EXPECT_EQ(request.GetSharingSID(), "");
}

TEST(RequestSharingUrl, IsAskedForWithTheUrlsPartsOnceAndKept) {
  FakePlatform::Reset();
  APIRequest request = requestWithEnv(
      R"({"HTTP_HOST":"nas:5001","HTTPS":"on","REQUEST_URI":"/webapi/entry.cgi","HOST":"h",
          "REWRITE_APP":"photo"})");
  EXPECT_EQ(request.GetSharingURL("default"), "sharing:nas/webapi/");
  EXPECT_EQ(request.GetSharingURLType(), sharing::SHARING_URL_HOST);
  EXPECT_EQ(request.Serialize()["url"]["urlSharing"], Json::Value("sharing:nas/webapi/"));
  EXPECT_EQ(FakePlatform::Get().calls,
            std::vector<std::string>{"GetSharingURL(nas, 5001, https, /webapi/, )"});
}

TEST(RequestSharingUrl, TakesTheRewriteApplicationWhenThereIsNoHostVariable) {
  FakePlatform::Reset();
  const APIRequest request =
      requestWithEnv(R"({"HTTP_HOST":"nas","REQUEST_URI":"/p/x","REWRITE_APP":"photo"})");
  EXPECT_EQ(request.GetSharingURLType(), sharing::SHARING_URL_REWRITE);
  EXPECT_EQ(request.GetSharingURL("default"), "sharing:nas/p/photo");
  EXPECT_EQ(FakePlatform::Get().calls,
            std::vector<std::string>{"GetSharingURL(nas, 80, http, /p/, photo)"});
}

TEST(RequestSharingUrl, HasPortZeroAndNoPathWhenTheEnvironmentSaysNothing) {
  FakePlatform::Reset();
  const APIRequest request;
  EXPECT_EQ(request.GetSharingURL("default"), "sharing:");
  EXPECT_EQ(FakePlatform::Get().calls, std::vector<std::string>{"GetSharingURL(, 0, http, , )"});
}

TEST(RequestSharingUrl, ThatThePlatformDoesNotKnowIsKeptEmptyAndNotAskedForAgain) {
  FakePlatform::Reset().sharingUrlKnown = false;
  APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas","REWRITE_APP":"photo"})");
  EXPECT_EQ(request.GetSharingURL("default"), "");
  EXPECT_EQ(request.GetSharingURLType(), sharing::SHARING_URL_REWRITE);
  EXPECT_EQ(request.Serialize()["url"]["urlSharing"], Json::Value(""));
  FakePlatform::Get().sharingUrlKnown = true;
  EXPECT_EQ(request.GetSharingURL("default"), "");
  EXPECT_EQ(FakePlatform::Get().calls.size(), 1u);
}

TEST(RequestSharingUrl, OfACopyIsComputedForTheRequestCopiedFrom) {
  FakePlatform::Reset();
  const APIRequest request = requestWithEnv(R"({"HTTP_HOST":"first","HOST":"h"})");
  APIRequest copy(request);
  copy.InitEnv(json(R"({"HTTP_HOST":"second"})"));
  EXPECT_EQ(copy.GetURLHost(""), "second");
  EXPECT_EQ(copy.GetSharingURL(""), "sharing:first");
}

TEST(RequestSharingUrl, TypeComputedBeforeTheCopyIsTheCopysToo) {
  FakePlatform::Reset();
  const APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas","REWRITE_APP":"photo"})");
  EXPECT_EQ(request.GetSharingURLType(), sharing::SHARING_URL_REWRITE);
  const APIRequest copy(request);
  EXPECT_EQ(copy.GetSharingURLType(), sharing::SHARING_URL_REWRITE);
  EXPECT_EQ(FakePlatform::Get().calls.size(), 1u);
}

TEST(RequestSharingUrl, TravelsWithTheRecordAndIsNotAskedForAgain) {
  FakePlatform::Reset();
  APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas","HOST":"h"})");
  EXPECT_EQ(request.GetSharingURL(""), "sharing:nas");
  Json::Value record = request.Serialize();
  APIRequest rebuilt;
  rebuilt.Deserialize(record);
  EXPECT_TRUE(rebuilt.Serialize()["url"].isMember("initialized"));
  EXPECT_EQ(rebuilt.GetSharingURL(""), "sharing:nas");
  EXPECT_EQ(FakePlatform::Get().calls.size(), 1u);
}
