#include <array>
#include <cmath>

#include "support/filter_models.h"

// The filters that send each plane through a table.

namespace picturezor {
namespace {

using Table = std::array<int, 256>;
using testing::PrintToString;

/// All samples from 0 to 255, sent through a filter.
Table Mapped(const std::function<Picture(const Picture&)>& filter) {
  const Picture ramp(256, 1, Format::G);
  SetPacked(ramp, Ramp());
  const Samples result = Packed(filter(ramp));
  Table table{};
  std::copy(result.begin(), result.end(), table.begin());
  return table;
}

TEST(SolarizeFilter, TreatsEveryPlaneAlike) {
  const Table table = Mapped([](const Picture& ramp) { return ramp.SolarizeFilter(); });
  // The ends, the bottom of the V, and two entries that lie beside its lines.
  EXPECT_EQ(
      (std::array{table[0], table[1], table[37], table[55], table[127], table[128], table[129], table[255]}),
      (std::array{255, 253, 180, 145, 0, 0, 2, 255}));
  // A wrong digit shows in the sums.
  int sum = 0, weighted = 0;
  for (int v = 0; v < 256; ++v) {
    sum += table[v];
    weighted += v * table[v];
  }
  EXPECT_EQ(sum, 32696);
  EXPECT_EQ(weighted, 4167372);
  ExpectPointFilter({[](const Picture& source, const Picture& dest) { return source.SolarizeFilter(dest); },
                     [&](Plane, std::uint8_t v, int, int) { return std::uint8_t(table[v]); }, true});
}

int Gamma(int v, double gamma) {
  const double value = std::pow(v / 255.0, 1.0 / gamma) * 255.0 + 0.5;
  return value < 0 || std::isnan(value) ? 0 : value > 255 ? 255 : int(value);
}

TEST(GammaFilter, HasAPowerInItsTable) {
  for (const double gamma : {1.0, 2.2, 1.8, 0.45, 0.5, 3.0, 100.0, 1e-3, 1e-300, -0.0, 0.0, -1.0, -2.5, 1e300,
                             double(INFINITY), -double(INFINITY), double(NAN)}) {
    SCOPED_TRACE(gamma);
    const Table table = Mapped([&](const Picture& ramp) { return ramp.GammaFilter({}, gamma); });
    for (int v = 0; v < 256; ++v) ASSERT_EQ(table[v], Gamma(v, gamma)) << v;
  }
  const Table same = Mapped([](const Picture& ramp) { return ramp.GammaFilter({}, 1.0); });
  for (int v = 0; v < 256; ++v) EXPECT_EQ(same[v], v);
  const Table none = Mapped([](const Picture& ramp) { return ramp.GammaFilter({}, 0.0); });
  EXPECT_EQ(std::count(none.begin(), none.end(), 0), 255);
  EXPECT_EQ(none[255], 255);
  const Table bright = Mapped([](const Picture& ramp) { return ramp.GammaFilter({}, 2.0); });
  EXPECT_EQ((std::array{bright[1], bright[64], bright[128]}), (std::array{16, 128, 181}));
}

TEST(GammaFilter, OverloadsNameTheirPlanes) {
  using Run = std::function<Picture(const Picture&, const Picture&)>;
  const auto expect = [](const Run& run, double red, double green, double blue, double gray,
                         std::optional<double> alpha) {
    std::array<Table, 9> tables{};
    for (const auto& [plane, gamma] : {std::pair{Plane::Gray, gray},
                                       {Plane::Red, red},
                                       {Plane::Green, green},
                                       {Plane::Blue, blue},
                                       {Plane::Alpha, alpha.value_or(1)}})
      for (int v = 0; v < 256; ++v) tables[std::size_t(plane)][std::size_t(v)] = Gamma(v, gamma);
    ExpectPointFilter({run, [&](Plane plane, std::uint8_t v, int, int) -> std::optional<std::uint8_t> {
                         if (plane == Plane::Alpha && !alpha) return {};
                         return std::uint8_t(tables[std::size_t(plane)][v]);
                       }});
  };
  expect([](const Picture& s, const Picture& d) { return s.GammaFilter(d, 1.8); }, 1.8, 1.8, 1.8, 1.8, {});
  expect([](const Picture& s, const Picture& d) { return s.GammaFilter(d, 1.8, 0.4); }, 1.8, 1.8, 1.8, 1.8,
         0.4);
  // (77 * 3 + 151 * 2 + 28 * 1) / 256 is 2.
  expect([](const Picture& s, const Picture& d) { return s.GammaFilter(d, 3.9, 2.5, 1.8); }, 3.9, 2.5, 1.8, 2,
         {});
  expect([](const Picture& s, const Picture& d) { return s.GammaFilter(d, 3.9, 2.5, 1.8, 0.7); }, 3.9, 2.5,
         1.8, 2, 0.7);
}

TEST(GammaFilter, MixesThreeInWholeNumbers) {
  const struct {
    double Red, Green, Blue, Mix;
  } cases[] = {{1.8, 1.8, 1.8, 1},    {0.9, 0.9, 0.9, 0}, {4, 0, 0, 1},
               {-2, -2, -2.9, -2},    {-1, 1, -3, 0},     {1e300, 1e300, 1e300, 2147483647},
               {double(NAN), 2, 0, 1}};
  for (const auto& [red, green, blue, mix] : cases) {
    SCOPED_TRACE(testing::Message() << red << ' ' << green << ' ' << blue);
    const Table table = Mapped([&](const Picture& ramp) { return ramp.GammaFilter({}, red, green, blue); });
    for (int v = 0; v < 256; ++v) ASSERT_EQ(table[v], Gamma(v, mix)) << v;
  }
}

/// The curve as a formula of t, with what the C library has for it.
int Gain(int i, double gain, double bias) {
  const double p = std::log(1.0 - gain) / std::log(0.5), b = 1.0 / bias - 2.0, t = i / 255.0;
  const double s = 1.0 - t;
  const double x = i == 0     ? 0.0
                   : i == 255 ? 1.0
                   : i < 128  ? std::pow(t + t, p) * 0.5
                              : 1.0 - 0.5 * std::pow(s + s, p);
  const double u = i == 0 ? 1.0 : i == 255 ? 0.0 : 1.0 - x;
  const double v = x / (u * b + 1.0) * 255.0;
  return std::isnan(v) || v < 0 ? 0 : v > 255 ? 255 : int(v);
}

TEST(GainFilter, HasItsCurveInTheTable) {
  for (const double gain : {0.5, 0.75, 0.3, 0.9, 0.0, 1.0, 1.5, -3.0, -1e300, double(NAN), double(INFINITY)})
    for (const double bias : {0.5, 0.25, 0.8, 1.0, 0.0, -0.5, 1e-300, double(NAN), double(INFINITY)}) {
      SCOPED_TRACE(testing::Message() << gain << ' ' << bias);
      const Table table = Mapped([&](const Picture& ramp) { return ramp.GainFilter({}, gain, bias); });
      for (int v = 0; v < 256; ++v) ASSERT_EQ(table[v], Gain(v, gain, bias)) << v;
    }
  const Table same = Mapped([](const Picture& ramp) { return ramp.GainFilter({}, 0.5, 0.5); });
  for (int v = 0; v < 256; ++v) EXPECT_TRUE(same[v] == v || same[v] == v - 1) << v;
  // p is 2: 0.5 (2 * 64 / 255)^2 * 255 is 32.1, and the same from the other end is 222.8.
  const Table steep = Mapped([](const Picture& ramp) { return ramp.GainFilter({}, 0.75, 0.5); });
  EXPECT_EQ((std::array{steep[0], steep[64], steep[191], steep[255]}), (std::array{0, 32, 222, 255}));
  ExpectPointFilter({[](const Picture& s, const Picture& d) { return s.GainFilter(d, 0.75, 0.5); },
                     [&](Plane, std::uint8_t v, int, int) { return std::uint8_t(steep[v]); }});
}

TEST(TransferFilter, OverloadsNameTheirPlanes) {
  Noise noise(61);
  std::array<std::vector<std::int32_t>, 4> values;
  for (auto& array : values)
    for (int i = 0; i < 256; ++i) array.push_back(noise.Between(-70000, 70000));
  const std::array<IntegerArray, 4> arrays{IntegerArray(values[0]), IntegerArray(values[1]),
                                           IntegerArray(values[2]), IntegerArray(values[3])};
  const auto& [red, green, blue, alpha] = arrays;
  using Run = std::function<Picture(const Picture&, const Picture&)>;
  // The array of gray, red, green, blue and alpha.
  const auto expect = [&](const Run& run, std::array<int, 5> of) {
    ExpectPointFilter({run, [&](Plane plane, std::uint8_t v, int, int) -> std::optional<std::uint8_t> {
                         const int array = of[plane == Plane::Alpha ? 4 : std::size_t(plane)];
                         if (array < 0) return {};
                         return std::uint8_t(values[std::size_t(array)][v]);
                       }});
  };
  expect([&](const Picture& s, const Picture& d) { return s.TransferFilter(d, red); }, {0, 0, 0, 0, -1});
  expect([&](const Picture& s, const Picture& d) { return s.TransferFilter(d, red, alpha); },
         {0, 0, 0, 0, 3});
  expect([&](const Picture& s, const Picture& d) { return s.TransferFilter(d, red, green, blue); },
         {1, 0, 1, 2, -1});
  expect([&](const Picture& s, const Picture& d) { return s.TransferFilter(d, red, green, blue, alpha); },
         {1, 0, 1, 2, 3});
}

TEST(TransferFilter, TakesArraysOfAnyLength) {
  std::vector<std::int32_t> ten, many;
  for (int i = 0; i < 10; ++i) ten.push_back(300 - i * 301);
  for (int i = 0; i < 1000; ++i) many.push_back(255 - i);
  const struct {
    IntegerArray Array;
    std::array<int, 4> At0And1And9And10;
  } cases[] = {{IntegerArray(), {0, 0, 0, 0}},
               {IntegerArray(std::vector<std::int32_t>{}), {0, 0, 0, 0}},
               {IntegerArray(ten), {44, 255, 151, 0}},
               {IntegerArray(many), {255, 254, 246, 245}}};
  for (const auto& [array, wanted] : cases) {
    const Table table = Mapped([&](const Picture& ramp) { return ramp.TransferFilter({}, array); });
    EXPECT_EQ((std::array{table[0], table[1], table[9], table[10]}), wanted);
    EXPECT_EQ(table[255], 0);
  }
}

}
}
