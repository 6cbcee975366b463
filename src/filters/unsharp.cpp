#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <optional>

#include "filters/byte_pattern.h"
#include "filters/filters.h"
#include "image/stores.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

/// What becomes of sample a beside b: a factor times their difference, from b on. Clamped first and truncated
/// then, which is the same; a sum that is not a number becomes 0 either way.
Sample Pushed(int a, int b, double factor) {
  const double v = factor * (a - b) + b;
  return Sample(int(v > 0 ? v < 255 ? v : 255 : 0));
}

/// The formula in whole numbers of 16 bits, for nearly all factors that are used. n times a factor, rounded
/// down, is n Whole + (n Part >> 16): the fractions that agree with the products fill an interval between
/// neighbours among those with denominators up to 255, which is wider than 2^-16 and so holds a Part.
struct WholePush {
  struct Product {
    std::uint16_t Whole, Part;
  };
  /// For a above b, and for a below b: there the product is rounded up, and so is 1 more than this one.
  Product Above, Below;
  /// Smaller differences leave a sample as it is.
  Sample Least;
  /// Where a product lies a hair below a whole number it counts as that number, since the sum with b, in a
  /// double, is rounded to it too. Not so a sum that is small beside the product: those of about twice the
  /// whole number at most are in doubt, if there are any, on one side of b. Nearly nothing is then rounded
  /// off a product of a above b, or is missing up to the next number below b: less than 2^-8.
  bool DoubtAbove = false, DoubtBelow = false;

  static std::optional<WholePush> Of(double factor, std::int32_t threshold);

 private:
  static std::optional<Product> ProductOf(double factor, bool negative);
  bool FindDoubts(double factor);
};

/// The sums stay in 16 bits.
constexpr double MostFactor = 126;

/// Whether a product isn't a whole number, but so near below one that a sum with b may be rounded to it. Sums
/// that aren't clamped are rounded to 2^-45 at the coarsest.
bool HairBelow(double product) {
  const double whole = std::floor(product);
  return product != whole && whole + 1 - product <= 0x1p-44;
}
double RoundedDown(double product) { return std::floor(product) + HairBelow(product); }

std::optional<WholePush::Product> WholePush::ProductOf(double factor, bool negative) {
  const auto rounded = [&](int n) {
    // What is further away is clamped, whatever it is.
    const double product = negative ? -RoundedDown(-factor * n) - 1 : RoundedDown(factor * n);
    return std::int32_t(std::min(product, 256.0));
  };
  const std::int32_t whole = rounded(1);
  // floor(n part / 2^16) == rest, for all n.
  std::int32_t least = 0, most = 65535;
  for (int n = 1; n <= 255; ++n) {
    const std::int32_t rest = rounded(n) - n * whole;
    least = std::max(least, ((rest << 16) + n - 1) / n);
    if (rest + n * whole < 256) most = std::min(most, (((rest + 1) << 16) - 1) / n);
  }
  if (least > most) return std::nullopt;
  // A whole number is then the least of what is rounded to it.
  return Product{std::uint16_t(whole), std::uint16_t(negative ? most : least)};
}

bool WholePush::FindDoubts(double factor) {
  for (int d = -255; d <= 255; ++d) {
    const double product = factor * d, whole = std::floor(product) + 1;
    if (!HairBelow(product)) continue;
    const std::uint16_t rest = d < 0 ? std::uint16_t(~(-d * Below.Part)) : std::uint16_t(d * Above.Part);
    const double most = d < 0 ? -2 * whole - 1 : 2 * whole + 1;
    for (int b = 0; b <= 255 && whole + b <= 255; ++b) {
      if (whole + b < 1 || product + b == whole + b) continue;
      if (whole + b > most || rest >= 256) return false;
      (d < 0 ? DoubtBelow : DoubtAbove) = true;
    }
  }
  return (!DoubtAbove && !DoubtBelow) || (DoubtAbove != DoubtBelow && Above.Whole == Below.Whole);
}

std::optional<WholePush> WholePush::Of(double factor, std::int32_t threshold) {
  if (!(factor > 0 && factor <= MostFactor) || threshold > 255) return std::nullopt;
  const auto above = ProductOf(factor, false), below = ProductOf(factor, true);
  if (!above || !below) return std::nullopt;
  WholePush push{*above, *below, Sample(std::max(threshold, 0))};
  if (!push.FindDoubts(factor)) return std::nullopt;
  return push;
}

/// Pushes the samples of a row away from those beside them. `mask` has 255 for samples and 0 for what lies
/// between them. By masks, not by choices, so that it becomes vector code. With `Doubts` a sample in doubt
/// stays as it is, and gets 255 in `doubts`, where others get 0.
template <bool Doubts>
void PushRun(Sample* __restrict samples, const Sample* beside, const Sample* mask, Sample* __restrict doubts,
             std::ptrdiff_t count, const WholePush& push) {
  const auto [whole, part] = push.Above;
  const std::uint16_t otherWhole = whole ^ push.Below.Whole, otherPart = part ^ push.Below.Part;
  const Sample least = push.Least;
  const std::int16_t doubtBelow = push.DoubtBelow ? -1 : 0;
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const Sample sample = samples[i], other = beside[i], most = sample < other ? other : sample,
                 fewest = other < sample ? other : sample, apart = Sample(most - fewest);
    const std::int16_t a = sample, b = other, d = std::int16_t(a - b), below = std::int16_t(-(d < 0));
    const std::uint16_t n = std::uint16_t(std::abs(d)), partOf = std::uint16_t(part ^ (otherPart & below));
    const std::uint16_t high = std::uint16_t(std::uint32_t{n} * partOf >> 16);
    const std::uint16_t wholeOf = Doubts ? whole : std::uint16_t(whole ^ (otherWhole & below)),
                        product = std::uint16_t(std::uint16_t(n * wholeOf) + high);
    // Below b it is taken away, and 1 more.
    const std::int16_t sum = std::int16_t(b + std::int16_t(product ^ below));
    const std::int16_t v = sum < 0 ? std::int16_t{0} : sum > 255 ? std::int16_t{255} : sum;
    Sample moved = Sample(Sample(-(apart >= least)) & mask[i]);
    if constexpr (Doubts) {
      // On the other side of b, where nothing is in doubt, what is small there is large.
      const std::uint16_t rest = std::uint16_t(std::uint16_t(n * partOf) ^ doubtBelow);
      const std::int16_t half = std::int16_t(std::uint16_t(sum) >> 1),
                         large = std::int16_t(-(half > std::int16_t(product)));
      const Sample clear = Sample(std::uint16_t(rest | large) >> 8),
                   doubt = Sample(Sample(-(clear == 0)) & moved);
      doubts[i] = doubt;
      moved = Sample(moved & ~doubt);
    }
    samples[i] = Sample((Sample(v) & moved) | (sample & ~moved));
  }
}

/// A row in whole numbers, and what is in doubt by the formula itself.
void PushRow(Sample* samples, const Sample* beside, const Sample* mask, std::ptrdiff_t count,
             const WholePush& push, double factor) {
  Sample* const none = nullptr;
  if (!push.DoubtAbove && !push.DoubtBelow)
    return OnBestTarget<PushRun<false>>(samples, beside, mask, none, count, push);
  Sample doubts[BytePattern::Most];
  OnBestTarget<PushRun<true>>(samples, beside, mask, static_cast<Sample*>(doubts), count, push);
  const auto next = [&](std::ptrdiff_t i) {
    const void* found = std::memchr(doubts + i, 255, std::size_t(count - i));
    return found ? static_cast<const Sample*>(found) - doubts : count;
  };
  for (std::ptrdiff_t i = next(0); i < count; i = next(i + 1))
    samples[i] = Pushed(samples[i], beside[i], factor);
}

/// The formula as a table by both samples, for other factors, for planes that lie in other ways and for
/// pictures that share samples: those have to be read one after the other, each after the ones before it have
/// been written.
struct PushTable {
  Sample Cell[256][256];

  PushTable(double factor, std::int32_t threshold) {
    for (int a = 0; a < 256; ++a)
      for (int b = 0; b < 256; ++b)
        Cell[a][b] = std::abs(a - b) < threshold ? Sample(a) : Pushed(a, b, factor);
  }
};

}

Boolean UnsharpFilter(PictureZOR* self, PictureZOR* origpixels, Double Amount, Integer Threshold) {
  PictureData& picture = DataOf(self);
  if (!origpixels) return false;
  PictureData& blurred = DataOf(origpixels);
  if (!picture.Valid || !blurred.Valid || picture.Width != blurred.Width ||
      picture.Height != blurred.Height || picture.ImageFormat != blurred.ImageFormat)
    return false;
  if (!Usable(picture)) return false;
  MayYield(picture);
  if (!Usable(blurred)) return false;
  MayYield(blurred);

  const double factor = Amount * 4.0 + 1.0;
  const Group group = GroupOf(picture);
  const PlaneList planes = PlanesOf(group, picture), from = PlanesOf(group, blurred);
  Walk walk(From(blurred), Into(picture));
  const bool inRuns = picture.Width > 0 && LieAlike(planes, from) && !SharePixels(picture, blurred);
  if (const auto whole = inRuns ? WholePush::Of(factor, Threshold) : std::nullopt) {
    const RowBytes bytes(planes, picture.Width);
    const std::int32_t firstBeside = FirstOffset(from);
    const BytePattern mask = bytes.Mask();
    return walk.Rows(picture.Height, [&](std::int32_t, Sample* beside, Sample* row) {
      mask.Along(bytes.Count, [&](std::ptrdiff_t at, std::ptrdiff_t count, const Sample* bits) {
        PushRow(row + bytes.First + at, beside + firstBeside + at, bits, count, *whole, factor);
      });
    });
  }
  const PushTable pushed(factor, Threshold);
  bool done = true;
  ForPlaneCount(planes.Count, [&](auto n) {
    done = walk.Rows(picture.Height, [&](std::int32_t, Sample* beside, Sample* row) {
      const PlaneRow<n> b(beside, from), sample(row, planes);
      for (std::ptrdiff_t x = 0; x < picture.Width; ++x)
        for (int c = 0; c < n; ++c) sample(c, x) = pushed.Cell[sample(c, x)][b(c, x)];
    });
  });
  return done;
}

}
