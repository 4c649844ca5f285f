// What a transfer does when memory runs out; how it fares on a network is tested with real hosts.

#include "platform/relay/module/Transfer.h"

#include "tests/unit/platform/FailingNew.h"
#include "tests/unit/platform/relay/FakeCurl.h"

namespace QELO::Platform {
namespace {

class TransferTest : public testing::Test {
 protected:
  void SetUp() override {
    curl = FakeCurl();
    call.url = "https://localhost/webapi/entry.cgi";
    call.headers = {"X-Qelo-Relay: 1", "X-Qelo-Access-Token: t", "Content-Type: text/plain"};
  }

  FakeCurl& curl = FakeCurl::Now();
  RelayCall call;
};

TEST_F(TransferTest, PrepareHandsOverAllHeaders) {
  {
    Transfer transfer(call);
    ASSERT_TRUE(transfer.Prepare());
    EXPECT_EQ(curl.headers, (std::vector<std::string>{"X-Qelo-Relay: 1", "X-Qelo-Access-Token: t",
                                                      "Content-Type: text/plain", "Expect:"}));
  }
  EXPECT_EQ(curl.lists, 0);
}

TEST_F(TransferTest, WithoutMemoryForEachHeaderNothingIsSentAndNoneIsLost) {
  for (int taken = 0; taken <= 3; ++taken) {
    curl.appends = taken;
    {
      Transfer transfer(call);
      EXPECT_FALSE(transfer.Prepare()) << taken;
    }
    EXPECT_EQ(call.error, CRED_REQUEST_NO_TRANSPORT) << taken;
    EXPECT_TRUE(curl.headers.empty()) << taken;
    EXPECT_EQ(curl.lists, 0) << taken;
  }
}

TEST_F(TransferTest, WithoutMemoryForTheAnswerTheCallFailsAndNothingIsThrown) {
  Transfer transfer(call);
  ASSERT_TRUE(transfer.Prepare());
  std::string part(size_t{1} << 20, 'x');
  EXPECT_EQ(curl.write(part.data(), 1, part.size(), curl.reader), part.size());
  {
    const FailingNew starved(4096);
    EXPECT_EQ(curl.write(part.data(), 1, part.size(), curl.reader), 0U);
    transfer.Finish(CURLE_WRITE_ERROR);
  }
  EXPECT_EQ(call.error, CRED_REQUEST_BROKEN);
  EXPECT_EQ(call.reason, "no memory is left for the answer");
  EXPECT_EQ(call.answer.capacity(), std::string().capacity());
}

}  // namespace
}  // namespace QELO::Platform
