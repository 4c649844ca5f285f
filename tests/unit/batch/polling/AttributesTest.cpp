#include "tests/unit/batch/polling/Fixture.h"

namespace QELO {
namespace {

using PollingAttributes = PollingTest;

TEST_F(PollingAttributes, ErrorIs500AtFirst) {
  EXPECT_EQ(APIPolling().GetError(), 500);
  EXPECT_EQ(polling->GetError(), 500);
}

TEST_F(PollingAttributes, ErrorIsWhatWasSet) {
  polling->SetError(508);
  EXPECT_EQ(polling->GetError(), 508);
}

TEST_F(PollingAttributes, AreStoredInTheirSection) {
  APIPollingPrivate record(request.get(), nullptr);
  EXPECT_EQ(Text(record.Serialize()), R"({"polling_attribute":{}})");
  EXPECT_TRUE(record.SetGroupAttr("everyone"));
  EXPECT_EQ(Text(record.Serialize()), R"({"polling_attribute":{"share_to_group":"everyone"}})");
}

TEST_F(PollingAttributes, SettersAccept) {
  EXPECT_TRUE(polling->SetPrefixAttr("copy"));
  EXPECT_TRUE(polling->SetRemoveAttr(false));
  EXPECT_TRUE(polling->SetRemoveParam(true));
  EXPECT_TRUE(polling->SetGroupAttr(""));
  EXPECT_TRUE(polling->SetGroupAttr("everyone"));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(PollingAttributes, UnknownGroupIsRefused) {
  EXPECT_FALSE(polling->SetGroupAttr("user"));
  EXPECT_FALSE(polling->SetGroupAttr("Admin"));
  EXPECT_EQ(SyslogCapture::Count("bad parameters"), 2);
}

TEST_F(PollingAttributes, AdminGroupIsRefusedToAnOrdinaryUser) {
  EXPECT_FALSE(polling->SetGroupAttr("admin"));
  EXPECT_EQ(SyslogCapture::Count("No permission"), 1);
}

TEST_F(PollingAttributes, AdminGroupIsRefusedWithoutRequest) {
  EXPECT_FALSE(APIPolling().SetGroupAttr("admin"));
  EXPECT_EQ(SyslogCapture::Count("No permission"), 1);
}

TEST_F(PollingAttributes, AdminGroupIsGrantedToAnAdministrator) {
  Login("admin", true);
  EXPECT_TRUE(polling->SetGroupAttr("admin"));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(PollingAttributes, RefusedGroupLeavesTheFormerOne) {
  ASSERT_TRUE(polling->SetGroupAttr("everyone"));
  ASSERT_FALSE(polling->SetGroupAttr("nobody"));
  ASSERT_TRUE(polling->Start(
      response.get(), [](APIRequest*, APIResponse* own, void*) { own->SetSuccess(); }, nullptr));
  EXPECT_EQ(Text(response->GetBody()), R"({"data":{"task_id":"@users/id1"},"success":true})");
}

}  // namespace
}  // namespace QELO
