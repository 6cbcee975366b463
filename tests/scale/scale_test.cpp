#include <gmock/gmock.h>

#include <array>
#include <cmath>

#include "image/picture_data.h"
#include "support/every_store.h"
#include "support/every_target.h"

namespace picturezor {
namespace {

constexpr Kernel AllKernels[] = {Kernel::Triangle, Kernel::Box,   Kernel::Lanczos3, Kernel::Lanczos8,
                                 Kernel::Mitchell, Kernel::Poly3, Kernel::Cubic};

// A second implementation, sample by sample, as slow as it is plain.

double Radius(Kernel kernel) {
  constexpr double radii[] = {0, 1, 0.5, 3, 8, 2, 4, 3};
  return radii[int(kernel)];
}

/// The value of a kernel; nothing beyond its reach.
std::optional<double> ValueAt(Kernel kernel, double a) {
  const auto sinc = [](double t) {
    const double p = t * 3.141592653589793;
    return t == 0 ? 1.0 : double(std::sin(static_cast<long double>(p))) / p;
  };
  const double s = a * a;
  switch (kernel) {
    case Kernel::Triangle: return a < 1 ? std::optional(1 - a) : std::nullopt;
    case Kernel::Box: return a <= 0.5 ? std::optional(1.0) : std::nullopt;
    case Kernel::Lanczos3: return a < 3 ? std::optional(sinc(a) * sinc(a / 3)) : std::nullopt;
    case Kernel::Lanczos8: return a < 8 ? std::optional(sinc(a) * sinc(a * 0.125)) : std::nullopt;
    case Kernel::Mitchell:
      if (a < 1) return (a * s * 7 + s * -12 + 16.0 / 3) / 6;
      if (a < 2) return (a * s * (-7.0 / 3) + s * 12 + a * -20 + 32.0 / 3) / 6;
      return {};
    case Kernel::Poly3:
      if (a < 1) return a * (a * (a * 1.25 - 2.25)) + 1;
      if (a < 2) return a * (a * (a * -0.75 + 3.75) - 6) + 3;
      return {};
    case Kernel::Cubic:
      if (a <= 1) return a * (s * (4.0 / 3)) + s * (-7.0 / 3) + 1;
      if (a <= 2) return a * (s * (-7.0 / 12)) + s * 3 + a * (-59.0 / 12) + 2.5;
      if (a <= 3) return a * (s * (1.0 / 12)) + s * (-2.0 / 3) + a * 1.75 - 1.5;
      return {};
  }
  return {};
}

struct Line {
  std::vector<std::pair<float, int>> Entries;
  float Sum = 0;
};

std::vector<Line> LinesOf(Kernel kernel, int output, int source) {
  const double scale = double(output) / source, radius = Radius(kernel);
  std::vector<Line> lines(static_cast<std::size_t>(output));
  for (int d = 0; d < output; ++d) {
    const double centre = (d + 0.5) / scale;
    double sum = 0;
    for (int i = 0; i < source; ++i) {
      double x = (centre - i) - 0.5;
      if (scale < 1) x *= scale;
      if (std::abs(x) > radius + 1) continue;
      const auto value = ValueAt(kernel, std::abs(x));
      if (!value || *value == 0) continue;
      lines[std::size_t(d)].Entries.emplace_back(float(*value), i);
      sum += *value;
    }
    lines[std::size_t(d)].Sum = float(sum);
  }
  return lines;
}

std::uint8_t Cut(double sum, float divisor) {
  const double quotient = sum / double(divisor);
  return !(quotient >= 1) ? 0 : quotient >= 255 ? 255 : std::uint8_t(quotient);
}

/// A channel of a picture, or luma of three.
using Plane = std::vector<std::uint8_t>;
struct Terms {
  std::vector<Plane> Planes;
  std::vector<double> Shares;
};

/// Both passes over one channel.
Plane Scaled(const Terms& source, int width, int height, int into, int down, Kernel kernel) {
  const auto across = LinesOf(kernel, into, width), along = LinesOf(kernel, down, height);
  Plane temp, result;
  for (int y = 0; y < height; ++y)
    for (const Line& line : across) {
      double sum = 0;
      for (const auto& [weight, i] : line.Entries)
        for (std::size_t p = 0; p < source.Planes.size(); ++p) {
          const double sample = source.Planes[p][std::size_t(y * width + i)];
          sum += double(weight) * (source.Shares.empty() ? sample : sample * source.Shares[p]);
        }
      temp.push_back(Cut(sum, line.Sum));
    }
  for (const Line& line : along)
    for (int x = 0; x < into; ++x) {
      double sum = 0;
      for (const auto& [weight, i] : line.Entries) sum += double(weight) * temp[std::size_t(i * into + x)];
      result.push_back(Cut(sum, line.Sum));
    }
  return result;
}

Plane PlaneOf(const Picture& view) { return view.DataStringInFormat(Format::G); }

enum class Kind { Gray, RGB, CMYK };
Kind KindOf(const Picture& picture) {
  return picture.IsGray() ? Kind::Gray : picture.IsRGB() ? Kind::RGB : Kind::CMYK;
}
std::vector<Picture> ColoursOf(const Picture& p) {
  switch (KindOf(p)) {
    case Kind::Gray: return {p.GrayChannel()};
    case Kind::RGB: return {p.RedChannel(), p.GreenChannel(), p.BlueChannel()};
    default: return {p.CyanChannel(), p.MagentaChannel(), p.YellowChannel(), p.BlackChannel()};
  }
}

/// The planes of dest that are written.
std::vector<Picture> WrittenIn(const Picture& dest, const Picture& source) {
  std::vector<Picture> views = ColoursOf(dest);
  if (dest.HasAlpha() && source.HasAlpha()) views.push_back(dest.AlphaChannel());
  return views;
}

/// What feeds each of them.
std::vector<Terms> FeedsOf(const Picture& source, const Picture& dest) {
  std::vector<Plane> planes;
  for (const Picture& view : ColoursOf(source)) planes.push_back(PlaneOf(view));
  std::vector<Terms> feeds;
  const Kind from = KindOf(source), into = KindOf(dest);
  if (from == into)
    for (const Plane& plane : planes) feeds.push_back({{plane}, {}});
  else if (from == Kind::Gray)
    feeds.assign(ColoursOf(dest).size(), {planes, {}});
  else if (from == Kind::RGB)
    feeds.push_back({planes, {0.3, 0.59, 0.11}});
  else
    feeds.push_back({{planes[3]}, {}});
  if (source.HasAlpha() && dest.HasAlpha()) feeds.push_back({{PlaneOf(source.AlphaChannel())}, {}});
  return feeds;
}

/// Compares what a scale left in dest, whose size is the result's, with the second implementation.
void ExpectScaled(const Picture& dest, const Picture& source, Kernel kernel,
                  const std::vector<Terms>& feeds) {
  const std::vector<Picture> views = WrittenIn(dest, source);
  ASSERT_EQ(views.size(), feeds.size());
  for (std::size_t c = 0; c < views.size(); ++c)
    EXPECT_EQ(PlaneOf(views[c]),
              Scaled(feeds[c], source.Width(), source.Height(), dest.Width(), dest.Height(), kernel))
        << "plane " << c;
}

// One row each, worked out by hand from the kernels' formulas.
TEST(Scale, GivesTheWorkedRows) {
  const struct {
    Kernel Of;
    Samples Half, Grown;
  } cases[] = {
      {Kernel::Triangle, {71, 209}, {10, 14, 20, 44, 60}}, {Kernel::Box, {50, 227}, {10, 10, 20, 60, 60}},
      {Kernel::Lanczos3, {56, 225}, {10, 9, 20, 47, 63}},  {Kernel::Lanczos8, {54, 228}, {12, 6, 20, 49, 62}},
      {Kernel::Mitchell, {68, 212}, {9, 12, 21, 45, 60}},  {Kernel::Poly3, {59, 222}, {8, 10, 20, 46, 64}},
      {Kernel::Cubic, {59, 222}, {9, 10, 19, 46, 63}},
  };
  Picture four(4, 1, Format::G), three(3, 1, Format::G);
  four.SetRowInFormat(0, Format::G, Samples{0, 100, 200, 255});
  three.SetRowInFormat(0, Format::G, Samples{10, 20, 60});
  ForEveryTarget([&] {
    for (const auto& [kernel, half, grown] : cases) {
      SCOPED_TRACE(int(kernel));
      const Picture two(2, 1, Format::G), five(5, 1, Format::G);
      EXPECT_TRUE(two.Scale(four, {}, kernel, 2, 1));
      EXPECT_TRUE(five.Scale(three, {}, kernel, 5, 1));
      EXPECT_EQ(two.RowInFormat(0, Format::G), half);
      EXPECT_EQ(five.RowInFormat(0, Format::G), grown);
    }
  });
}

struct Size {
  int Width, Height;
};

// Catches a fast form that differs: on noise, on flat and on nearly flat pictures, with steep ratios, simple
// ones and none, and with widths around the vector sizes.
TEST(Scale, IsTheSameOnEveryTarget) {
  const std::pair<Size, Size> sizes[] = {
      {{64, 48}, {16, 12}}, {{61, 45}, {17, 13}}, {{40, 30}, {30, 23}}, {{17, 9}, {68, 36}},
      {{33, 21}, {47, 30}}, {{5, 4}, {131, 7}},   {{300, 40}, {7, 3}},  {{50, 50}, {50, 50}},
      {{1, 1}, {9, 9}},     {{1000, 3}, {1, 1}},  {{22, 37}, {66, 37}}, {{97, 33}, {32, 11}},
      {{130, 5}, {65, 5}},  {{9, 1}, {40, 50}},   {{2, 9}, {1500, 9}},  {{40, 5}, {6000, 7}},
  };
  unsigned seed = 500;
  for (const auto& [from, into] : sizes)
    for (const Kernel kernel : AllKernels)
      for (const int texture : {0, 1, 2, 3}) {
        constexpr Format formats[] = {Format::RGB, Format::G, Format::BGRA, Format::CMYKA};
        const Format format = formats[++seed % 4];
        SCOPED_TRACE(testing::Message() << from.Width << 'x' << from.Height << " to " << into.Width << 'x'
                                        << into.Height << " kernel " << int(kernel) << " texture " << texture
                                        << " format " << int(format) << " seed " << seed);
        const Picture source = NoisePicture(from.Width, from.Height, format, seed);
        Samples pixels = Packed(source);
        for (auto& sample : pixels)
          sample = texture == 1   ? std::uint8_t(100 + (seed % 8) * 20)
                   : texture == 2 ? std::uint8_t(sample & 1 ? 200 : 199)
                   : texture == 3 ? std::uint8_t(sample & 1 ? 255 : 0)
                                  : sample;
        SetPacked(source, pixels);
        const Picture wanted(into.Width, into.Height, format);
        const std::vector<Terms> feeds = FeedsOf(source, wanted);
        bool first = true;
        ForEveryTarget([&] {
          const Picture dest(into.Width, into.Height, format);
          ASSERT_TRUE(dest.Scale(source, {}, kernel, into.Width, into.Height));
          if (std::exchange(first, false)) {
            ExpectScaled(dest, source, kernel, feeds);
            SetPacked(wanted, Packed(dest));
          } else {
            EXPECT_EQ(Packed(dest), Packed(wanted));
          }
          ASSERT_TRUE(dest.ScaleMT(int(seed % 5), source, {}, kernel, into.Width, into.Height));
          EXPECT_EQ(Packed(dest), Packed(wanted)) << "on threads";
        });
      }
}

// Lines that look at more rows than any cache holds; with a temporary picture and without.
TEST(Scale, LooksAtAnyNumberOfRows) {
  const std::vector<Kernel> wide(std::begin(AllKernels) + 2, std::end(AllKernels));
  const struct {
    Size From, Into;
    Format Of, Temp;
    std::vector<Kernel> Kernels;
  } cases[] = {
      {{1, 3073}, {1, 1}, Format::G, Format::Scaling1, {Kernel::Triangle}},
      {{30, 3300}, {3, 17}, Format::RGB, Format::Scaling4, {Kernel::Lanczos8}},
      {{6, 4000}, {6, 4}, Format::CMYKA, Format::Scaling5, wide},
      {{1, 32000}, {1, 10}, Format::GA, Format::Scaling2, {Kernel::Box}},
  };
  unsigned seed = 700;
  for (const auto& [from, into, format, between, kernels] : cases)
    for (const Kernel kernel : kernels) {
      SCOPED_TRACE(testing::Message() << "from height " << from.Height << " kernel " << int(kernel));
      const Picture source = NoisePicture(from.Width, from.Height, format, ++seed);
      const Picture wanted(into.Width, into.Height, format);
      ASSERT_TRUE(wanted.Scale(source, {}, kernel, into.Width, into.Height));
      ExpectScaled(wanted, source, kernel, FeedsOf(source, wanted));
      const Picture memory(from.Width, from.Height, between);
      const auto expectSame = [&](const Picture& temp, int threads) {
        const Picture dest(into.Width, into.Height, format);
        ASSERT_TRUE(dest.ScaleMT(threads, source, temp, kernel, into.Width, into.Height));
        EXPECT_EQ(Packed(dest), Packed(wanted)) << threads;
      };
      ForEveryTarget([&] {
        for (const Picture& temp : {Picture{}, memory})
          for (const int threads : {-1, 1, 4}) expectSame(temp, threads);
      });
      // Its window moves with every few rows, which takes long.
      if (into.Height == 1)
        expectSame(StoredPicture(StoredPicture::Mapped, from.Width, from.Height, between).Get(), 4);
    }
}

// Every way between families, with and without alpha on either side, fillers and odd orders included.
TEST(Scale, KnowsFourteenPairs) {
  const Format formats[] = {Format::G,    Format::AG,    Format::TwoOf4, Format::RGB,
                            Format::XBGR, Format::ABGR,  Format::RGBA,   Format::XCMYK,
                            Format::KYMC, Format::AKYMC, Format::CMYKA};
  unsigned seed = 900;
  for (const Format from : formats)
    for (const Format into : formats) {
      SCOPED_TRACE(testing::Message() << "from " << int(from) << " into " << int(into) << " seed " << ++seed);
      const Picture source = NoisePicture(23, 11, from, seed);
      const Picture dest = NoisePicture(14, 17, into, seed + 1000);
      const auto before = StoredRows(dest);
      const bool possible =
          KindOf(source) == Kind::Gray || KindOf(dest) == Kind::Gray || KindOf(source) == KindOf(dest);
      ForEveryTarget([&] {
        SetStoredRows(dest, before);
        ASSERT_EQ(dest.Scale(source, {}, Kernel::Lanczos3, 14, 17), possible);
        if (!possible) {
          EXPECT_EQ(StoredRows(dest), before);
          return;
        }
        ExpectScaled(dest, source, Kernel::Lanczos3, FeedsOf(source, dest));
        // What isn't a plane of the pair is as it was.
        const Picture was(14, 17, into);
        SetStoredRows(was, before);
        for (const Picture& cleared : {dest, was})
          for (const Picture& view : WrittenIn(cleared, source))
            view.SetDataStringInFormat(Format::G, Samples(14 * 17));
        EXPECT_EQ(StoredRows(dest), StoredRows(was));
      });
    }
}

// Catches a row kept over a window move, and a write beyond a view.
TEST(Scale, WorksOnEveryStore) {
  const Picture noise = NoisePicture(19, 13, Format::RGBA, 31);
  const Picture wanted(9, 11, Format::RGBA);
  ASSERT_TRUE(wanted.Scale(noise, {}, Kernel::Mitchell, 9, 11));
  ForEveryStore(19, 13, Format::RGBA, [&](const Picture& source) {
    SetPacked(source, Packed(noise));
    ForEveryStore(9, 11, Format::RGBA, [&](const Picture& dest) {
      ASSERT_TRUE(dest.Scale(source, {}, Kernel::Mitchell, 9, 11));
      EXPECT_EQ(Packed(dest), Packed(wanted));
    });
  });
  // A caller's temporary picture in any store, larger than it has to be.
  for (const auto kind :
       {StoredPicture::Memory, StoredPicture::Block, StoredPicture::Mapped, StoredPicture::Mirrored}) {
    const StoredPicture temp(kind, 12, 15, Format::Scaling4);
    const Picture dest(9, 11, Format::RGBA);
    EXPECT_TRUE(dest.Scale(noise, temp.Get(), Kernel::Mitchell, 9, 11));
    EXPECT_EQ(Packed(dest), Packed(wanted));
    EXPECT_TRUE(temp.SurroundingsIntact());
    for (const int threads : {-1, 0, 1, 2, 5, 40}) {
      const Picture other(9, 11, Format::RGBA);
      EXPECT_TRUE(other.ScaleMT(threads, noise, temp.Get(), Kernel::Mitchell, 9, 11));
      EXPECT_EQ(Packed(other), Packed(wanted)) << threads;
    }
  }
}

TEST(Scale, MayReadTheDestination) {
  const Picture picture = NoisePicture(30, 20, Format::RGB, 77), copy = picture.Clone();
  const Picture wanted(20, 15, Format::RGB);
  ASSERT_TRUE(wanted.Scale(copy, {}, Kernel::Poly3, 20, 15));
  ASSERT_TRUE(picture.Scale(picture, {}, Kernel::Poly3, 20, 15));
  EXPECT_EQ(Packed(picture.ClipImage({0, 0, 20, 15})), Packed(wanted));
  EXPECT_EQ(Packed(picture.ClipImage({20, 0, 10, 20})), Packed(copy.ClipImage({20, 0, 10, 20})));
}

TEST(Scale, RefusesWhatDoesntFit) {
  const Picture source = NoisePicture(8, 6, Format::RGB, 1), dest = NoisePicture(5, 4, Format::RGB, 2);
  const auto before = StoredRows(dest);
  const Picture invalid(0, 1, Format::RGB), small(4, 6, Format::Scaling4), low(5, 5, Format::Scaling4);
  const Picture thin(5, 6, Format::Scaling2), raw(5, 4, Format::Scaling4);
  const Picture wide(10, 6, Format::RGBA);
  const Picture inner = wide.ClipImage({2, 0, 8, 6});
  constexpr int Most = 0x7FFFFFFF;
  const struct {
    Picture Source, Temp;
    int Mode, Width, Height;
  } cases[] = {
      {{}, {}, 1, 5, 4},           {source, {}, 0, 5, 4},
      {source, {}, 8, 5, 4},       {source, {}, -1, 5, 4},
      {source, {}, 1, 0, 4},       {source, {}, 1, 5, -1},
      {source, {}, 1, 6, 4},       {source, {}, 1, 5, 5},
      {source, {}, 1, Most, Most}, {invalid, {}, 1, 5, 4},
      {source, invalid, 1, 5, 4},  {raw, {}, 1, 5, 4},
      {source, small, 1, 5, 4},    {source, low, 1, 5, 4},
      {source, thin, 1, 5, 4},     {source, inner, 1, 5, 4},
      {source, source, 1, 5, 4},   {source, Picture(9, 9, Format::RGBA).RedChannel(), 1, 5, 4},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.Mode << ' ' << c.Width << ' ' << c.Height);
    EXPECT_FALSE(dest.Scale(c.Source, c.Temp, Kernel(c.Mode), c.Width, c.Height));
    EXPECT_FALSE(dest.ScaleMT(2, c.Source, c.Temp, Kernel(c.Mode), c.Width, c.Height));
  }
  EXPECT_EQ(StoredRows(dest), before);
  EXPECT_FALSE(invalid.Scale(source, {}, Kernel::Box, 1, 1));
  EXPECT_FALSE(dest.Scale(source.ClipImage({8, 0, 5, 5}), {}, Kernel::Box, 5, 4)) << "a source of no columns";
}

// Source, dest and temporary picture in one block, or in one file: what counts is whether they share bytes.
TEST(Scale, TakesATemporaryPictureBesideTheOthers) {
  const Picture noise = NoisePicture(5, 4, Format::RGBA, 3), wanted(5, 4, Format::RGBA);
  ASSERT_TRUE(wanted.Scale(noise, {}, Kernel::Cubic, 5, 4));
  const TemporaryFile file;
  const MemoryBlock block(480);
  const Picture wholes[] = {Picture(block, 10, 12, Format::RGBA, 40),
                            Picture::Mapped(file.Path(), 10, 12, Format::RGBA, 1)};
  for (const Picture& whole : wholes) {
    SCOPED_TRACE(whole.IsMapping());
    const Picture temp = whole.ClipImage({0, 4, 5, 4});
    for (const auto& [x, y, apart] :
         {std::tuple{5, 4, true}, {4, 4, false}, {0, 0, true}, {0, 1, false}, {0, 7, false}, {3, 8, true}}) {
      SCOPED_TRACE(testing::Message() << x << ' ' << y);
      const Picture part = whole.ClipImage({x, y, 5, 4});
      for (const int threads : {-1, 2}) {
        SetPacked(part, Packed(noise));
        EXPECT_EQ(part.ScaleMT(threads, noise, temp, Kernel::Cubic, 5, 4), apart);
        EXPECT_TRUE(!apart || Packed(part) == Packed(wanted));
        SetPacked(part, Packed(noise));
        const Picture dest(5, 4, Format::RGBA);
        EXPECT_EQ(dest.ScaleMT(threads, part, temp, Kernel::Cubic, 5, 4), apart);
        EXPECT_TRUE(!apart || Packed(dest) == Packed(wanted));
      }
    }
  }
  // Raw pixels begin where their rows do, whatever is clipped off.
  const Picture raw(block, 10, 12, Format::Scaling4, 40), left(block, 5, 12, Format::RGBA, 40);
  EXPECT_FALSE(left.Scale(noise, raw.ClipImage({5, 0, 5, 4}), Kernel::Cubic, 5, 4));
}

// Catches a temporary picture of a factory that is used although it can't be, or that is never given back.
TEST(Scale, AsksAFactoryForItsTemporaryPicture) {
  const Picture source = NoisePicture(8, 6, Format::G, 5), dest(4, 3, Format::G), wanted(4, 3, Format::G);
  ASSERT_TRUE(wanted.Scale(source, {}, Kernel::Triangle, 4, 3));
  int asked = 0;
  const auto with = [&](PictureFactory::Handler handler) {
    asked = 0;
    source.SetFactory(PictureFactory([&asked, handler](int width, int height, Format format) {
      ++asked;
      return handler(width, height, format);
    }));
  };
  with([](int width, int height, Format format) {
    const Picture larger = NoisePicture(width + 3, height + 5, format, 6);
    return larger;
  });
  EXPECT_TRUE(dest.Scale(source, {}, Kernel::Triangle, 4, 3));
  EXPECT_EQ(Packed(dest), Packed(wanted)) << "rows below the source's don't count";
  EXPECT_EQ(asked, 1);
  with([](int width, int height, Format) { return Picture(width, height, Format::RGB); });
  EXPECT_FALSE(dest.Scale(source, {}, Kernel::Triangle, 4, 3));
  EXPECT_FALSE(dest.ScaleMT(2, source, {}, Kernel::Triangle, 4, 3));
  EXPECT_GT(asked, 1);
  EXPECT_LT(asked, 20);
  int turn = 0;
  with([&turn](int width, int height, Format format) {
    return Picture(width, height, turn++ == 0 ? Format::RGB : format);
  });
  EXPECT_TRUE(dest.Scale(source, {}, Kernel::Triangle, 4, 3));
  turn = 0;
  EXPECT_TRUE(dest.ScaleMT(2, source, {}, Kernel::Triangle, 4, 3));
  const TemporaryFile file;
  with([&file](int width, int height, Format format) {
    return Picture::Mapped(file.Path(), width, height, format);
  });
  EXPECT_FALSE(dest.Scale(source, {}, Kernel::Triangle, 4, 3));
  source.SetFactory({});
}

// A pictures' hook may close what is being scaled.
TEST(Scale, OutlivesAPictureClosedDuringAYield) {
  for (const bool closeSource : {false, true}) {
    const Picture source = NoisePicture(40, 30, Format::RGB, 8), dest(20, 15, Format::RGB);
    dest.SetYieldTicks(1);
    DataOf(dest).LastYieldTick = 0;
    Host::OnYield([&] { (closeSource ? source : dest).Close(); });
    dest.Scale(source, {}, Kernel::Lanczos3, 20, 15);
    Host::OnYield({});
  }
  // On threads the samples stay until the work is done.
  for (const bool closeSource : {false, true}) {
    const Picture source = NoisePicture(900, 700, Format::RGB, 9), dest(600, 500, Format::RGB);
    const Picture shown = dest.ClipImage(), wanted(600, 500, Format::RGB);
    ASSERT_TRUE(wanted.Scale(source, {}, Kernel::Lanczos3, 600, 500));
    Host::OnYield([&] { (closeSource ? source : dest).Close(); });
    EXPECT_TRUE(dest.ScaleMT(2, source, {}, Kernel::Lanczos3, 600, 500));
    Host::OnYield({});
    EXPECT_EQ(Packed(shown), Packed(wanted));
  }
}

TEST(ScaleFast, TakesTruncatedPlaces) {
  const struct {
    int From, Into;
    Samples Columns;
  } cases[] = {{2, 4, {0, 0, 1, 1}}, {4, 2, {0, 2}}, {3, 2, {0, 1}}, {3, 3, {0, 1, 2}}, {7, 3, {0, 2, 4}}};
  for (const auto& [from, into, columns] : cases)
    for (const Format format : {Format::G, Format::RGB, Format::XRGB, Format::CMYKA}) {
      SCOPED_TRACE(testing::Message() << int(format) << ", " << from << " to " << into);
      // Place c of the pixel at x, y.
      const auto sample = [](int x, int y, int c) { return std::uint8_t(16 * y + x + 64 * c); };
      const Picture source(from, from, format);
      const int size = BytesPerPixel(format);
      Samples pixels, wanted;
      for (int i = 0; i < from * from * size; ++i)
        pixels.push_back(sample(i / size % from, i / size / from, i % size));
      SetPacked(source, pixels);
      for (const auto y : columns)
        for (const auto x : columns)
          for (int c = 0; c < size; ++c)
            wanted.push_back(format == Format::XRGB && c == 0 ? 9 : sample(x, y, c));
      ForEveryStore(into, into, format, [&, into = into](const Picture& dest) {
        SetPacked(dest, Samples(wanted.size(), 9));
        // A size beyond dest's is cut to it.
        ASSERT_TRUE(dest.ScaleFast(source, into + 5, 0x7FFFFFFF));
        EXPECT_EQ(Packed(dest), wanted);
        for (const int none : {0, -1, -0x7FFFFFFF - 1}) {
          EXPECT_FALSE(dest.ScaleFast(source, none, 1));
          EXPECT_FALSE(dest.ScaleFast(source, 1, none));
        }
      });
    }
}

Samples Repeated(const Samples& pixel, int count) {
  Samples all;
  for (int i = 0; i < count; ++i) all.insert(all.end(), pixel.begin(), pixel.end());
  return all;
}

// Which pairs there are, and what a pixel becomes.
TEST(ScaleFast, ConvertsOnTheWay) {
  using F = Format;
  const struct {
    F From, Into;
    Samples Source, Dest;  // empty for none
  } cases[] = {
      {F::CMYKA, F::KYMCA, {1, 2, 3, 4, 5}, {4, 3, 2, 1, 5}},
      {F::CMYKA, F::CMYKX, {1, 2, 3, 4, 5}, {1, 2, 3, 4, 9}},
      {F::CMYKA, F::GA, {1, 2, 3, 4, 5}, {4, 5}},
      {F::CMYKA, F::G, {1, 2, 3, 4, 5}, {4}},
      {F::CMYKA, F::RGB, {1, 2, 3, 4, 5}, {}},
      {F::CMYK, F::CMYK, {1, 2, 3, 4}, {}},
      {F::CMYK, F::G, {1, 2, 3, 4}, {}},
      {F::RGBA, F::ABGR, {1, 2, 3, 4}, {4, 3, 2, 1}},
      {F::RGBA, F::GA, {255, 255, 255, 7}, {255, 7}},
      {F::RGBA, F::RGB, {1, 2, 3, 4}, {1, 2, 3}},
      {F::RGB, F::RGBA, {1, 2, 3}, {1, 2, 3, 9}},
      {F::RGB, F::XBGR, {1, 2, 3}, {9, 3, 2, 1}},
      {F::RGB, F::AG, {200, 100, 50}, {9, 124}},
      {F::RGB, F::CMYK, {1, 2, 3}, {}},
      {F::GA, F::AG, {6, 7}, {7, 6}},
      {F::GA, F::G, {6, 7}, {6}},
      {F::GA, F::RGBA, {6, 7}, {6, 6, 6, 7}},
      {F::GA, F::RGB, {6, 7}, {6, 6, 6}},
      {F::GA, F::CMYKA, {6, 7}, {0, 0, 0, 6, 7}},
      {F::GA, F::CMYK, {6, 7}, {0, 0, 0, 6}},
      {F::G, F::GA, {6}, {6, 9}},
      {F::G, F::RGBA, {6}, {6, 6, 6, 9}},
      {F::G, F::CMYK, {6}, {0, 0, 0, 6}},
      {F::G, F::CMYKA, {6}, {}},
      {F::Scaling3, F::RGB, {1, 2, 3}, {}},
      {F::RGB, F::Scaling3, {1, 2, 3}, {}},
  };
  for (const auto& [from, into, pixel, wanted] : cases) {
    SCOPED_TRACE(testing::Message() << int(from) << " to " << int(into));
    const Samples nines(std::size_t(42 * BytesPerPixel(into)), 9);
    ForEveryStore(7, 6, into, [&, pixel = pixel, wanted = wanted, from = from](const Picture& dest) {
      SetPacked(dest, nines);
      const Picture source(3, 5, from);
      SetPacked(source, Repeated(pixel, 15));
      ASSERT_EQ(dest.ScaleFast(source, 7, 6), !wanted.empty());
      EXPECT_EQ(Packed(dest), wanted.empty() ? nines : Repeated(wanted, 42));
    });
  }
}

// A picture may be scaled onto itself; a mapped one too, whose window then moves between the two rows.
TEST(ScaleFast, MayReadTheDestination) {
  const auto scaled = [](const Picture& picture) {
    SetPacked(picture, Noise(55).Many(20 * 12));
    EXPECT_TRUE(picture.ScaleFast(picture, 10, 6));
    return Packed(picture);
  };
  const Samples wanted = scaled(Picture(20, 12, Format::G));
  ForEveryStore(20, 12, Format::G, [&](const Picture& picture) { EXPECT_EQ(scaled(picture), wanted); });
}

}
}
