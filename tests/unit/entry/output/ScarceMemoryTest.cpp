// Answers that there is no memory for.

#include "tests/unit/entry/output/ScarceMemory.h"

#include <memory>

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

constexpr size_t kLarge = 4U << 20U;  ///< bytes of what cannot be had in one piece

/// An entry whose memory is scarce from the moment when its answer is there.
class ScarceEntry : public TestEntry {
 public:
  bool Initialize(const Json::Value&) override {
    Fill();
    scarce_ = std::make_unique<ScarceMemory>(kLarge / 2);
    return false;
  }

 private:
  virtual void Fill() = 0;

  std::unique_ptr<ScarceMemory> scarce_;
};

class ScarceOutput : public CgiTest {
 protected:
  template <typename Entry>
  static void ExpectIs117() {
    const CgiAnswer answer = Printed([] {
      Entry entry;
      entry.Run(Json::Value());
    });
    EXPECT_EQ(answer.Code(), 117);
    EXPECT_TRUE(answer.HasLine("X-Content-Type-Options: nosniff"));
    EXPECT_EQ(answer.text.find("Content-type"), answer.text.rfind("Content-type"));
    EXPECT_EQ(SyslogCapture::Count("WebEntry.cpp:"), 1);
    EXPECT_EQ(SyslogCapture::Count("std::bad_alloc"), 1);
  }
};

TEST_F(ScarceOutput, BodyWithoutMemoryIsLoggedAndAnswered117) {
  struct LargeBody : ScarceEntry {
    void Fill() override { Response()->SetSuccess(std::string(kLarge, 'x')); }
  };
  ExpectIs117<LargeBody>();
}

TEST_F(ScarceOutput, HeaderWithoutMemoryIsLoggedAndAnswered117) {
  struct LargeHeader : ScarceEntry {
    void Fill() override {
      Response()->SetSuccess();
      Response()->SetHeader("X-Large", std::string(kLarge, 'x'));
    }
  };
  ExpectIs117<LargeHeader>();
}

}  // namespace
}  // namespace QELO
