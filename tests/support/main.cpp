#include <gtest/gtest.h>

#include "picturezor/host.h"

namespace {

/// Fails a test that leaves anything alive in the host.
class LeakCheck : public testing::EmptyTestEventListener {
  void OnTestStart(const testing::TestInfo&) override { Before = picturezor::Host::Count(); }
  void OnTestEnd(const testing::TestInfo&) override {
    const auto after = picturezor::Host::Count();
    EXPECT_EQ(after.Objects, Before.Objects) << "objects left alive";
    EXPECT_EQ(after.Strings, Before.Strings) << "strings left alive";
    EXPECT_EQ(after.MemoryBlocks, Before.MemoryBlocks) << "memory blocks left alive";
  }

  picturezor::Host::Alive Before;
};

}

/// Every test finds the module loaded, and leaves nothing alive.
int main(int count, char** arguments) {
  testing::InitGoogleTest(&count, arguments);
  picturezor::Host::Load(PICTUREZOR_MODULE);
  testing::UnitTest::GetInstance()->listeners().Append(new LeakCheck);
  return RUN_ALL_TESTS();
}
