#include <sys/prctl.h>

#include <cstring>

#include "tests/unit/runner/RunnerFixture.h"
#include "webapi/runner/APIRunnerPrivate.h"

namespace QELO {
namespace {

class ProcessName : public RunnerTest {
 protected:
  static std::string ThreadName() {
    char name[17] = {};
    prctl(PR_GET_NAME, name);
    return name;
  }
  /// Argument text in an area of its own, as main()'s stands.
  char area[64] = "/usr/bin/some-long-program-name";
  char* arguments[2] = {area, nullptr};
};

TEST_F(ProcessName, NamesIdentityArgumentAndThreadAfterTheCall) {
  TestRunner tested;
  tested.SetArgs(1, arguments);
  MakeRequest("QELO.Test.Call", 2, "run");
  EXPECT_TRUE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(SyslogCapture::Identity(), "unit_runner_QELO.Test.Call_2_run");
  EXPECT_STREQ(area, "unit_runner_QELO.Test.Call_2_r");  // cut to the room there was
  EXPECT_EQ(ThreadName(), "QELO.Test.Call_");            // the kernel keeps 15 bytes
}

TEST_F(ProcessName, EmptyApiIs101) {
  TestRunner tested;
  MakeRequest("", 1, "run");
  EXPECT_FALSE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 101);
}

TEST_F(ProcessName, IdentityIsCutTo1023Bytes) {
  TestRunner tested;
  MakeRequest("Q." + std::string(2000, 'a'), 1, "run");
  EXPECT_TRUE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(SyslogCapture::Identity().size(), 1023u);
}

TEST_F(ProcessName, DestructionGivesTheNameBack) {
  {
    TestRunner tested;
    tested.SetArgs(1, arguments);
    MakeRequest("QELO.Test.Call", 2, "run");
    tested.SetProcessName(request.get(), response.get());
  }
  EXPECT_EQ(SyslogCapture::Identity(), "unit_runner");
  EXPECT_STREQ(area, "unit_runner");
  EXPECT_EQ(ThreadName(), "unit_runner");
}

TEST_F(ProcessName, NothingIsWrittenWithoutArguments) {
  APIRunnerPrivate tested(nullptr);
  tested.SetArgv0("x");  // nowhere to write to
  tested.SetArgs(0, arguments);
  tested.SetArgv0("x");
  EXPECT_STREQ(area, "/usr/bin/some-long-program-name");
  tested.SetArgs(1, arguments);
  tested.SetArgv0("x");
  EXPECT_STREQ(area, "x");
  EXPECT_EQ(tested.GetProcName(), "unit_runner");
  EXPECT_EQ(tested.GetOrigProcName(), "unit_runner");
}

}  // namespace
}  // namespace QELO
