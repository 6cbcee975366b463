#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <optional>

#include "filters/byte_pattern.h"
#include "filters/filters.h"
#include "image/stores.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

/// What becomes of sample a beside b: a factor times their difference, from b on. Clamped first and truncated
/// then, as vectors have it, which is the same; a sum that is not a number becomes 0 either way.
Sample Pushed(int a, int b, double factor, std::int32_t threshold) {
  const double v = factor * (a - b) + b;
  const int pushed = int(v > 0 ? v < 255 ? v : 255 : 0);
  return Sample(std::abs(a - b) < threshold ? a : pushed);
}

/// Pushes the samples of a row away from those beside them. `mask` has 255 for samples and 0 for what lies
/// between them.
void PushRun(Sample* samples, const Sample* beside, const Sample* mask, std::ptrdiff_t count, double factor,
             std::int32_t threshold) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const Sample pushed = Pushed(samples[i], beside[i], factor, threshold);
    samples[i] = Sample((pushed & mask[i]) | (samples[i] & ~mask[i]));
  }
}

/// The formula in whole numbers of 16 bits, for nearly all factors that are used. d times a factor, rounded
/// down, is d Whole + (d Part >> 16): the multiples of 2^-16 that agree with the products of all d above 0
/// fill an interval between neighbours among the fractions with denominators up to 255, and so do those that
/// agree with the products of all d below 0. Where a product is a whole number, the one begins and the other
/// ends there, so that each sign has a Part of its own.
struct WholePush {
  std::int16_t Whole, PartAbove, PartBelow;
  /// Smaller differences leave a sample as it is.
  Sample Least;
  /// A product that lies a hair below a whole number counts as that number: the sum with b, in a double, is
  /// rounded to it too. Of some differences no sum is; of others none below a certain size. All are on one
  /// side, that of the error of the factor.
  struct Hair {
    Sample Apart = 0, From = 0;
  };
  static constexpr int MostNever = 8, MostSmall = 4;
  std::array<Sample, MostNever> NeverRounded{};
  std::array<Hair, MostSmall> NotWhenSmall{};
  int NeverCount = 0, SmallCount = 0;
  bool HairsBelow = false;

  static std::optional<WholePush> Of(double factor, std::int32_t threshold);

 private:
  bool FindHairs(double factor);
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

/// The multiples of 2^-16 that have the products of a factor.
struct Multipliers {
  std::int64_t Least = 0, Most = std::int64_t(MostFactor) << 16;

  static Multipliers Above(double factor) {
    Multipliers all;
    for (int n = 1; n <= 255; ++n) {
      // What is further away is clamped, whatever it is.
      const auto product = std::int64_t(std::min(RoundedDown(factor * n), 256.0));
      all.Least = std::max(all.Least, ((product << 16) + n - 1) / n);
      if (product < 256) all.Most = std::min(all.Most, (((product + 1) << 16) - 1) / n);
    }
    return all;
  }
  /// Of n below 0, whose products are rounded away from it.
  static Multipliers Below(double factor) {
    Multipliers all;
    for (int n = 1; n <= 255; ++n) {
      const auto product = std::int64_t(std::min(-RoundedDown(-factor * n), 256.0));
      all.Least = std::max(all.Least, ((product - 1) << 16) / n + 1);
      if (product < 256) all.Most = std::min(all.Most, (product << 16) / n);
    }
    return all;
  }
};

bool WholePush::FindHairs(double factor) {
  for (int d = -255; d <= 255; ++d) {
    const double product = factor * d, whole = std::floor(product) + 1;
    if (!HairBelow(product)) continue;
    // The largest sum that isn't rounded; larger ones are.
    int from = 1, largest = 0;
    for (int b = 0; b <= 255 && whole + b <= 255; ++b) {
      largest = int(whole) + b;
      if (largest >= 1 && product + b != largest) from = largest + 1;
    }
    if (from == 1) continue;
    const bool below = d < 0;
    if (NeverCount + SmallCount > 0 && below != HairsBelow) return false;
    HairsBelow = below;
    const auto apart = Sample(std::abs(d));
    if (from > largest) {
      if (NeverCount == MostNever) return false;
      NeverRounded[std::size_t(NeverCount++)] = apart;
    } else {
      if (SmallCount == MostSmall) return false;
      NotWhenSmall[std::size_t(SmallCount++)] = {apart, Sample(from)};
    }
  }
  return true;
}

std::optional<WholePush> WholePush::Of(double factor, std::int32_t threshold) {
  if (!(factor > 0 && factor <= MostFactor) || threshold > 255) return std::nullopt;
  const Multipliers above = Multipliers::Above(factor), below = Multipliers::Below(factor);
  if (above.Least > above.Most || below.Least > below.Most) return std::nullopt;
  const std::int64_t whole = (above.Least + 0x8000) >> 16, partAbove = above.Least - (whole << 16),
                     partBelow = std::clamp(above.Least, below.Least, below.Most) - (whole << 16);
  if (partBelow != std::int16_t(partBelow)) return std::nullopt;
  WholePush push{std::int16_t(whole), std::int16_t(partAbove), std::int16_t(partBelow),
                 Sample(std::max(threshold, 0))};
  if (!push.FindHairs(factor)) return std::nullopt;
  return push;
}

/// By masks, not by choices, so that it becomes vector code. For up to so many differences of either kind; an
/// apart of 0 is on neither side.
template <int Never, int Small>
void PushRunWhole(Sample* __restrict samples, const Sample* beside, const Sample* mask, std::ptrdiff_t count,
                  const WholePush& push) {
  const std::int16_t whole = push.Whole, above = push.PartAbove,
                     other = std::int16_t(push.PartAbove ^ push.PartBelow);
  const Sample least = push.Least, side = push.HairsBelow ? 255 : 0;
  Sample never[Never + 1], small[Small + 1], from[Small + 1];
  for (int h = 0; h < Never; ++h) never[h] = push.NeverRounded[std::size_t(h)];
  for (int h = 0; h < Small; ++h) {
    small[h] = push.NotWhenSmall[std::size_t(h)].Apart;
    from[h] = push.NotWhenSmall[std::size_t(h)].From;
  }
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const Sample a = samples[i], b = beside[i], apart = Sample(std::max(a, b) - std::min(a, b));
    const std::int16_t d = std::int16_t(a - b), part = std::int16_t(above ^ (other & -std::int16_t(d < 0)));
    const std::int16_t rest = std::int16_t(std::int32_t{d} * part >> 16);
    std::int16_t v = std::int16_t(std::int16_t(std::int16_t(d * whole) + rest) + b);
    const Sample hasHairs = Sample(-(side ? a < b : a > b));
    if constexpr (Never > 0) {
      Sample less = 0;
      for (int h = 0; h < Never; ++h) less |= Sample(-(apart == never[h]));
      v = std::int16_t(v - std::int16_t(less & hasHairs & 1));
    }
    v = v < 0 ? std::int16_t{0} : v > 255 ? std::int16_t{255} : v;
    Sample pushed = Sample(v);
    if constexpr (Small > 0) {
      Sample less = 0;
      for (int h = 0; h < Small; ++h) less |= Sample(-(apart == small[h]) & -(pushed < from[h]));
      less &= hasHairs & 1;
      pushed = Sample(std::max(pushed, less) - less);
    }
    const Sample moved = Sample(Sample(-(apart >= least)) & mask[i]);
    samples[i] = Sample((pushed & moved) | (a & ~moved));
  }
}

void PushRow(Sample* samples, const Sample* beside, const Sample* mask, std::ptrdiff_t count,
             const WholePush& push) {
  const auto has = [&](int never, int small) { return push.NeverCount <= never && push.SmallCount <= small; };
  has(0, 0)   ? OnBestTarget<PushRunWhole<0, 0>>(samples, beside, mask, count, push)
  : has(1, 1) ? OnBestTarget<PushRunWhole<1, 1>>(samples, beside, mask, count, push)
  : has(4, 4) ? OnBestTarget<PushRunWhole<4, 4>>(samples, beside, mask, count, push)
              : OnBestTarget<PushRunWhole<WholePush::MostNever, WholePush::MostSmall>>(samples, beside, mask,
                                                                                       count, push);
}

/// The formula as a table by both samples, for planes that lie in other ways and for pictures that share
/// samples: those have to be read one after the other, each after the ones before it have been written.
struct PushTable {
  Sample Cell[256][256];

  PushTable(double factor, std::int32_t threshold) {
    for (int a = 0; a < 256; ++a)
      for (int b = 0; b < 256; ++b) Cell[a][b] = Pushed(a, b, factor, threshold);
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
  if (picture.Width > 0 && LieAlike(planes, from) && !SharePixels(picture, blurred)) {
    const RowBytes bytes(planes, picture.Width);
    const std::int32_t firstBeside = FirstOffset(from);
    const BytePattern mask = bytes.Mask();
    const std::optional<WholePush> whole = WholePush::Of(factor, Threshold);
    return walk.Rows(picture.Height, [&](std::int32_t, Sample* beside, Sample* row) {
      mask.Along(bytes.Count, [&](std::ptrdiff_t at, std::ptrdiff_t count, const Sample* bits) {
        Sample* const samples = row + bytes.First + at;
        const Sample* const others = beside + firstBeside + at;
        whole ? PushRow(samples, others, bits, count, *whole)
              : OnBestTarget<PushRun>(samples, others, bits, count, factor, Threshold);
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
