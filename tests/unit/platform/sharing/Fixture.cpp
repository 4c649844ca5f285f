#include "tests/unit/platform/sharing/Fixture.h"

#include "tests/unit/platform/DatabaseProgram.h"

void SharingLinks::Execute(const std::string& sql) {
  EXPECT_EQ(runSql(Path(kDatabase), sql), "");
}
