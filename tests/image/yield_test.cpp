#include <gtest/gtest.h>

#include <stdexcept>

#include "frame/host_services.h"
#include "image/picture_data.h"
#include "object_model.h"
#include "support/every_store.h"

namespace picturezor {
namespace {

// Catches a yield at every row, one that never comes, and a clock that stops it when it steps back.
TEST(YieldCheck, FiresAfterItsTicks) {
  zor::SetResolver([](const char* name) { return model::ServiceNamed(name); });
  const Picture picture(1, 1, Format::G);
  auto& data = DataOf(picture);
  int yields = 0;
  Host::OnYield([&] { ++yields; });
  const auto fires = [&](int ticks) {
    const int before = yields;
    picture.SetYieldTicks(ticks);
    zor::MayYield(data);
    return yields > before;
  };
  EXPECT_FALSE(fires(0));
  EXPECT_FALSE(fires(-1));
  EXPECT_TRUE(fires(1)) << "the first one, since no yield has been yet";
  const int now = data.LastYieldTick;
  EXPECT_NE(now, 0);
  EXPECT_FALSE(fires(1000000));
  data.LastYieldTick = now - 5000;
  EXPECT_TRUE(fires(5000));
  EXPECT_LT(data.LastYieldTick - now, 3600) << "counted from the end of the yield";
  data.LastYieldTick = now + 100000;
  EXPECT_FALSE(fires(200000));
  EXPECT_TRUE(fires(50000));
  EXPECT_LT(data.LastYieldTick - now, 3600);

  // What the hook throws waits for the end of the call.
  picture.SetYieldTicks(1);
  data.LastYieldTick = now - 5000;
  Host::OnYield([] { throw std::domain_error("stopped"); });
  zor::MayYield(data);
  EXPECT_THROW(model::ThrowPending(), std::domain_error);
  Host::OnYield({});
}

}
}
