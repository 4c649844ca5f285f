// InitSharingSession: what a request's record says of its caller when a link's owner is it.

#include "tests/unit/entry/sharing/Fixture.h"

namespace QELO {
namespace {

class LinkSession : public Links {
 protected:
  void SetUp() override {
    Links::SetUp();
    Describe(R"({"appPriv": "Files"})", kUnchecked);
  }
  const Json::Value& Init() {
    MakeRequest();
    entry->InitSharingSession(entry->Request());
    return entry->Request()->Serialize()["session"];
  }
};

TEST_F(LinkSession, HasAllThatALoginSessionHas) {
  platform->isAdmin = 1;
  platform->language = "ger";
  platform->tokenEnable = 1;
  entry = std::make_unique<LinkEntry<WebEntry>>();
  Get("api=QELO.Test.Good&version=1&method=echo");
  entry->Initialize(Json::Value());
  Json::Value data = Init();
  EXPECT_GE(data["timeout"].asInt(), 95);
  EXPECT_LE(data["timeout"].asInt(), 100);
  data.removeMember("timeout");
  Json::Value expected = Parse(R"({"appPriv": "Files", "username": "ann", "isAdmin": true,
      "sessFile": "", "isTimeout": false, "isSkipCheckIP": false, "uiLang": "ger", "webapi": "",
      "isAuthorized": true, "tokenEnable": true})");
  expected["app"] = link.projectName;
  EXPECT_EQ(data, expected);
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "ann");
}

TEST_F(LinkSession, UserIsLookedUpByTheSessionsOwnerAndFreed) {
  session = {9, 1002, time(nullptr) + 100};
  platform->users[1002] = "eve";
  EXPECT_EQ(Init()["username"], "eve");
  EXPECT_EQ(Calls("QELOUserGetByUID"), 1);
  EXPECT_EQ(Calls("QELOUserFree"), 1);
}

TEST_F(LinkSession, OfAccountsWithOneIdTheLinksOwnerIsMeant) {
  platform->users[1001] = "first";
  platform->userGetUGID = [](const std::string& name, uid_t* uid, gid_t* gid) {
    *uid = *gid = name == "ann" ? 1001 : 1;
    return 0;
  };
  EXPECT_EQ(Init()["username"], "ann");
}

TEST_F(LinkSession, OwnerOfAnotherIdIsNotMeant) {
  platform->users[1001] = "first";
  platform->userGetUGID = [](const std::string&, uid_t* uid, gid_t* gid) {
    *uid = *gid = 7;
    return 0;
  };
  EXPECT_EQ(Init()["username"], "first");
}

TEST_F(LinkSession, WithoutTheUserIsNobodys) {
  platform->users.clear();
  Set("QELO_WEBAPI_USERNAME", "bob");
  const Json::Value& data = Init();
  EXPECT_EQ(data["username"], "");
  EXPECT_EQ(data["isAuthorized"], false);
  EXPECT_EQ(data["isAdmin"], false);
  EXPECT_EQ(data["appPriv"], "");
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "");
  EXPECT_EQ(Calls("QELOUserFree"), 0);
}

TEST_F(LinkSession, PastItsEndIsTimedOut) {
  session = {9, 1001, time(nullptr) - 5};
  const Json::Value& data = Init();
  EXPECT_EQ(data["isTimeout"], true);
  EXPECT_EQ(data["timeout"], 0);
  EXPECT_EQ(data["isAuthorized"], false);
}

TEST_F(LinkSession, OfALinkWithoutAddressMatchIsNotBoundToAnAddress) {
  link.enableMatchIp = false;
  EXPECT_EQ(Init()["isSkipCheckIP"], true);
}

TEST_F(LinkSession, HasThePrivilegeThatTheOwnerHolds) {
  platform->appPriv = 0;
  EXPECT_EQ(Init()["appPriv"], "");
  EXPECT_EQ(Calls("QLIBAppPrivUserHas"), 1);
}

TEST_F(LinkSession, OfNoRequestIsNothing) {
  entry->InitSharingSession(nullptr);
  EXPECT_EQ(Calls("QELOUserGetByUID"), 0);
}

}  // namespace
}  // namespace QELO
