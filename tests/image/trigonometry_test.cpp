#include "image/trigonometry.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>

namespace zor {
namespace {

/// How far a result is from the true value, in units of its last place. The true value is taken from the C
/// library's long double.
long double Units(double result, long double exact) {
  const double next = std::nextafter(std::fabs(result), std::numeric_limits<double>::infinity());
  return std::fabs(result - exact) / (static_cast<long double>(next) - std::fabs(result));
}

TEST(Trigonometry, IsTheNearestDouble) {
  if constexpr (std::numeric_limits<long double>::digits < 64)
    GTEST_SKIP() << "no wider numbers to compare with";
  // The wider numbers have 11 bits more and an error of their own in the last.
  constexpr long double half = 0.5L + 1.0L / 1024;
  constexpr unsigned seed = 20061;
  SCOPED_TRACE(seed);
  std::mt19937_64 engine(seed);
  for (const double reach : {1e-9, 0.1, 0.8, 6.3, 25.2, 1e5}) {
    std::uniform_real_distribution<double> within(-reach, reach);
    for (int i = 0; i < 20000; ++i) {
      const double x = within(engine);
      ASSERT_LE(Units(Sine(x), std::sin(static_cast<long double>(x))), half) << std::hexfloat << x;
      ASSERT_LE(Units(Cosine(x), std::cos(static_cast<long double>(x))), half) << std::hexfloat << x;
      ASSERT_LE(Units(Tangent(x), std::tan(static_cast<long double>(x))), half) << std::hexfloat << x;
    }
  }
}

// The angles whose sine or cosine is next to nothing show a quarter that isn't known well enough. The values
// were computed with 60 digits.
TEST(Trigonometry, KeepsItsDigitsBesideWholeQuarters) {
  EXPECT_EQ(Sine(0x1.921fb54442d18p+1), 0x1.1a62633145c07p-53);
  EXPECT_EQ(Cosine(0x1.921fb54442d18p+0), 0x1.1a62633145c07p-54);
  EXPECT_EQ(Tangent(0x1.921fb54442d18p+0), 0x1.d02967c31cdb5p+53);
  EXPECT_EQ(Sine(0x1.921fb54442d18p+4), -0x1.1a62633145c07p-50);
  EXPECT_EQ(Cosine(0x1.6c6cbc45dc8dep+5), -0x1.6d61b58c99c43p-61);
  EXPECT_EQ(Sine(355.0), -0x1.f9bd0307d1de3p-16);
}

TEST(Trigonometry, HasThePlainAngles) {
  EXPECT_EQ(Sine(0.0), 0.0);
  EXPECT_TRUE(std::signbit(Sine(-0.0)) && std::signbit(Tangent(-0.0)));
  EXPECT_EQ(Cosine(0.0), 1.0);
  EXPECT_EQ(Sine(0x1.921fb54442d18p+0), 1.0);
  EXPECT_EQ(Cosine(-0x1.921fb54442d18p+1), -1.0);
  for (const double nowhere :
       {1.1e5, -1e300, std::numeric_limits<double>::infinity(), std::numeric_limits<double>::quiet_NaN()})
    for (const auto function : {Sine, Cosine, Tangent}) EXPECT_NE(function(nowhere), function(nowhere));
}

}
}
