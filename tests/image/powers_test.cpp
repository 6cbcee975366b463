#include "image/powers.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>

namespace picturezor {
namespace {

// The doubles nearest to values computed with 60 decimal digits. Catches a lost low part, which costs bits
// that no picture shows until a table entry flips.
TEST(Powers, AreTheNearestDoubles) {
  const struct {
    double Base, Exponent, Power;
  } powers[] = {
      {0x1.0101010101010p-8, 0x1.d1745d1745d17p-2, 0x1.49f904ba73d29p-4},
      {0x1.0101010101010p-2, 0x1.d1745d1745d17p-2, 0x1.1122d16f06302p-1},
      {0x1.0101010101010p-1, 0x1.0000000000000p+1, 0x1.0203040506070p-2},
      {0x1.fdfdfdfdfdfe0p-1, 0x1.1c71c71c71c72p-1, 0x1.fee230d5ca644p-1},
      {0x1.9191919191919p-1, 0x1.999999999999ap-4, 0x1.f3b6069497253p-1},
      {0x1.8181818181818p-7, 0x1.d99999999999ap+1, 0x1.37f7c4d6d80e2p-24},
      {0x1.fdfdfdfdfdfe0p-2, 0x1.4f8b588e368f1p-17, 0x1.ffff1619cbfdbp-1},
      {0x1.0101010101010p-1, -0x1.4000000000000p+1, 0x1.668374094e9dcp+2},
      {0x1.5555555555555p-1, 0x1.3441355475a32p-2, 0x1.c52b890e484cdp-1},
      {0x1.ffffde7210be9p-1, 0x1.81cd6c8b43958p+13, 0x1.f9b7c63437ed3p-1},
      {0x1.4000000000000p+2, 0x1.e800000000000p+4, 0x1.c3920144f86eap+70},
      {0x1.56e1fc2f8f359p-997, 0x1.47ae147ae147bp-7, 0x1.0624dd2f1a9fbp-10},
  };
  for (const auto& [base, exponent, power] : powers)
    EXPECT_EQ(zor::Power(base, exponent), power) << base << ' ' << exponent;
  const struct {
    double Value, Logarithm;
  } logarithms[] = {
      {0x1.0000000000000p-1, -0x1.62e42fefa39efp-1},   {0x1.0000000000000p-2, -0x1.62e42fefa39efp+0},
      {0x1.8000000000000p-1, -0x1.269621134db92p-2},   {0x1.ccccccccccccdp-1, -0x1.af8e8210a415cp-4},
      {0x1.999999999999ap-4, -0x1.26bb1bbb55515p+1},   {0x1.fffffffffffffp-1, -0x1.0000000000000p-53},
      {0x1.0000000000001p+0, 0x1.fffffffffffffp-53},   {0x1.8000000000000p+1, 0x1.193ea7aad030bp+0},
      {0x1.56e1fc2f8f359p-997, -0x1.5963447f87fb5p+9}, {0x1.e42d130773b76p+1023, 0x1.62dd08fdc6f88p+9},
      {0x1.6a0902de00d1bp-1, -0x1.62e6b3842a25ep-2},   {0x1.6a0a5269595ffp-1, -0x1.62e2fe73833b5p-2},
  };
  for (const auto& [value, logarithm] : logarithms) EXPECT_EQ(zor::Logarithm(value), logarithm) << value;
}

// The C library is within a unit in the last place.
TEST(Powers, LieBesideTheLibrarys) {
  std::mt19937_64 engine(101);
  std::uniform_real_distribution<double> some(-8, 8);
  const auto beside = [](double a, double b) { return a == b || a == std::nextafter(b, a); };
  for (int i = 0; i < 100000; ++i) {
    const double base = std::exp2(some(engine)), exponent = some(engine) * std::exp2(some(engine));
    ASSERT_TRUE(beside(zor::Power(base, exponent), std::pow(base, exponent))) << base << ' ' << exponent;
    ASSERT_TRUE(beside(zor::Logarithm(base), std::log(base))) << base;
    ASSERT_EQ(zor::Power(base, 1), base);
  }
}

TEST(Powers, HaveTheLibrarysSpecialCases) {
  using Limits = std::numeric_limits<double>;
  constexpr double infinity = Limits::infinity(), nan = Limits::quiet_NaN();
  const auto same = [](double a, double b) { return a == b || (a != a && b != b); };
  for (const double base : {0.0, 1e-320, 0.5, 1.0, 2.0, 1e300, infinity, nan})
    for (const double exponent : {0.0, -0.0, 0.5, 1.0, -1.0, 1e-320, 1e300, -1e300, infinity, -infinity, nan})
      EXPECT_TRUE(same(zor::Power(base, exponent), std::pow(base, exponent))) << base << ' ' << exponent;
  EXPECT_TRUE(same(zor::Power(-1, 0.5), nan));
  for (const double value : {0.0, -0.0, -1.0, infinity, -infinity, nan, 1.0, 5e-324})
    EXPECT_TRUE(same(zor::Logarithm(value), std::log(value))) << value;
}

}
}
