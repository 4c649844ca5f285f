// A compound request without the memory for what its entries share.

#include "tests/unit/batch/compound/FailingNew.h"
#include "tests/unit/batch/compound/Fixture.h"

namespace QELO {
namespace {

class CompoundMemory : public CompoundTest {
 protected:
  void ExpectRefusal(int allocations, const char* message) {
    Prepare(List({Entry("echo")}));
    CompoundHandler handler(request.get(), response.get(), runner.get());
    FailingNew::Left() = allocations;
    EXPECT_FALSE(handler.Process());
    FailingNew::Left() = -1;
    EXPECT_EQ(response->GetBody(),
              Parse(R"({"success": false, "error": {"code": 117, "errors": ""}})"));
    EXPECT_EQ(SyslogCapture::Count("CompoundHandler.cpp:"), 2);
    EXPECT_EQ(SyslogCapture::Count(message), 1);
    EXPECT_EQ(SyslogCapture::Count("PrepareNewCompReqResp failed"), 1);
    EXPECT_TRUE(platform->calls.empty());
  }
};

TEST_F(CompoundMemory, WithoutARequestTheOuterErrorIs117) {
  ExpectRefusal(0, "new APIRequest Fail");
}

TEST_F(CompoundMemory, WithoutAResponseTheOuterErrorIs117) {
  ExpectRefusal(1, "new APIResponse Fail");
}

}  // namespace
}  // namespace QELO
