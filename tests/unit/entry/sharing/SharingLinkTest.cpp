// SharingLink: links for the APIs that make and open them.

#include "webapi/SharingLink.h"

#include "tests/support/FakeSharing.h"
#include "tests/unit/entry/sharing/Fixture.h"

namespace QELO {
namespace {

class SharingLinks : public Links {
 protected:
  void SetUp() override {
    Links::SetUp();
    FakeSharing::Get() = FakeSharing();
    environment["REQUEST_METHOD"] = "POST";
    environment["QELO_REMOTE_IP"] = "192.0.2.7";
  }
  /// A request of ann's.
  std::unique_ptr<APIRequest> Request() {
    Json::Value init;
    init["environ"] = environment;
    init["session"]["username"] = "ann";
    return std::make_unique<APIRequest>(init);
  }
  SharingLink::Result Open() {
    visit = Json::Value();
    return SharingLink::Open(*Request(), "link", "pw", visit);
  }
  Json::Value environment;
  Json::Value visit;
};

TEST_F(SharingLinks, AreTheRequestsUsers) {
  FakeSharing::Get().answer["id"] = 7;
  Json::Value made;
  const Json::Value terms = Parse(R"({"project": "p"})");
  EXPECT_EQ(SharingLink::Create(*Request(), terms, made), SharingLink::LINK_OK);
  EXPECT_EQ(made["id"], 7);
  EXPECT_EQ(SharingLink::Change(*Request(), 7, terms, made), SharingLink::LINK_OK);
  EXPECT_EQ(SharingLink::List(*Request(), made), SharingLink::LINK_OK);
  EXPECT_EQ(SharingLink::Remove(*Request(), 7), SharingLink::LINK_OK);
  EXPECT_EQ(SharingLink::Find(*Request(), "secret", made), SharingLink::LINK_OK);
  EXPECT_EQ(platform->calls,
            (std::vector<std::string>{"CreateLink(ann, {\"project\":\"p\"})",
                                      "ChangeLink(ann, 7, {\"project\":\"p\"})", "ListLinks(ann)",
                                      "RemoveLink(ann, 7)", "FindLink(ann, secret)"}));
}

TEST_F(SharingLinks, ResultsAreThePlatforms) {
  const std::pair<sharing::LinkResult, SharingLink::Result> rows[] = {
      {sharing::LINK_ABSENT, SharingLink::LINK_ABSENT},
      {sharing::LINK_BAD_TERMS, SharingLink::LINK_BAD_TERMS},
      {sharing::LINK_TOO_MANY, SharingLink::LINK_TOO_MANY},
      {sharing::LINK_REFUSED, SharingLink::LINK_REFUSED},
      {sharing::LINK_WRONG_PASSWORD, SharingLink::LINK_WRONG_PASSWORD},
      {sharing::LINK_WAIT, SharingLink::LINK_WAIT},
      {sharing::LINK_FAILED, SharingLink::LINK_FAILED}};
  for (const auto& [platforms, expected] : rows) {
    FakeSharing::Get().result = platforms;
    EXPECT_EQ(SharingLink::Remove(*Request(), 7), expected);
  }
}

TEST_F(SharingLinks, OpenedOnesAreToldOf) {
  FakeSharing::Get().answer["sid"] = "S";
  EXPECT_EQ(Open(), SharingLink::LINK_OK);
  EXPECT_EQ(visit["sid"], "S");
  EXPECT_EQ(platform->calls.back(), "OpenLink(link, pw, 192.0.2.7)");
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_AUTH | LOG_INFO);
  EXPECT_EQ(SyslogCapture::Count("sharing link opened from 192.0.2.7"), 1);
}

TEST_F(SharingLinks, RefusedOpeningsAreToldOfWithTheReason) {
  FakeSharing::Get().result = sharing::LINK_WRONG_PASSWORD;
  EXPECT_EQ(Open(), SharingLink::LINK_WRONG_PASSWORD);
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_AUTH | LOG_NOTICE);
  EXPECT_EQ(SyslogCapture::Count("sharing link not opened from 192.0.2.7: wrong password"), 1);
}

TEST_F(SharingLinks, AreOpenedByPostFromOwnPagesAlone) {
  environment["REQUEST_METHOD"] = "GET";
  EXPECT_EQ(Open(), SharingLink::LINK_NOT_POST);
  environment["REQUEST_METHOD"] = "POST";
  environment["HTTP_SEC_FETCH_SITE"] = "cross-site";
  EXPECT_EQ(Open(), SharingLink::LINK_OTHER_SITE);
  EXPECT_EQ(Calls("OpenLink"), 0);
}

TEST_F(SharingLinks, OfARequestTellsWhatIsShared) {
  link.path = "/photos";
  link.allowUpload = true;
  platform->sharingEntry = sharing::record::Entry(link);
  environment[SZ_X_SHARING_HEADER] = "link";
  Json::Value expected = Parse(R"({"path": "/photos", "upload": true, "owner": "ann"})");
  expected["project"] = link.projectName;
  EXPECT_EQ(SharingLink::Of(*Request()), expected);
}

TEST_F(SharingLinks, OfARequestWithoutAKnownOneIsNull) {
  EXPECT_TRUE(SharingLink::Of(*Request()).isNull());
  environment[SZ_X_SHARING_HEADER] = "link";
  EXPECT_TRUE(SharingLink::Of(*Request()).isNull());
}

}  // namespace
}  // namespace QELO
