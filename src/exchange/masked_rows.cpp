#include "exchange/masked_rows.h"

#include <cstring>

#include "image/targets.h"

namespace zor {
namespace {

// What becomes of a pixel: from what stands there, the picture and the mask.

struct ColoursAlone {
  static constexpr int Planes = 3;
  static Colour<3> Of(const Colour<3>&, const Colour<3>& c, const Colour<3>&) { return c; }
};

template <bool Invert>
struct TakeMaskAsAlpha {
  static constexpr int Planes = 4;
  static Colour<4> Of(const Colour<4>&, const Colour<3>& c, const Colour<3>& mask) {
    return {c.Of[0], c.Of[1], c.Of[2], Sample(Invert ? 255 - mask.Of[0] : mask.Of[0])};
  }
};

/// v / 255, for the compiler's vectors of 16 bits.
constexpr std::uint16_t By255(std::uint16_t v) { return std::uint16_t((v + 1 + (v >> 8)) >> 8); }

static_assert([] {
  for (unsigned v = 0; v <= 255 * 255; ++v)
    if (By255(std::uint16_t(v)) != v / 255) return false;
  return true;
}());

/// 255 keeps what is there, 0 takes the other.
template <bool Invert>
constexpr Sample Blended(Sample there, Sample c, Sample mask) {
  const int keep = Invert ? 255 - mask : mask;
  return Sample(By255(std::uint16_t(there * keep + c * (255 - keep))));
}

template <bool Invert>
struct BlendByMask {
  static constexpr int Planes = 3;
  static Colour<3> Of(const Colour<3>& there, const Colour<3>& c, const Colour<3>& mask) {
    Colour<3> result;
    for (int i = 0; i < 3; ++i) result.Of[i] = Blended<Invert>(there.Of[i], c.Of[i], mask.Of[i]);
    return result;
  }
};

template <int N>
Colour<N> ReadPixel(const PlaneRow<N>& row, std::ptrdiff_t x) {
  Colour<N> colour;
  for (int c = 0; c < N; ++c) colour.Of[c] = row(c, x);
  return colour;
}

template <class Step>
void DrawRow(const Sample* from, const PlaneList& in, const Sample* mask, const PlaneList& inMask,
             Sample* into, const PlaneList& out, std::int32_t width) {
  const PlaneRow<3> colours(const_cast<Sample*>(from), in), masks(const_cast<Sample*>(mask), inMask);
  const PlaneRow<Step::Planes> dest(into, out);
  for (std::ptrdiff_t x = 0; x < width; ++x) {
    const auto result = Step::Of(ReadPixel(dest, x), ReadPixel(colours, x), ReadPixel(masks, x));
    for (int c = 0; c < Step::Planes; ++c) dest(c, x) = result.Of[c];
  }
}

template <bool Invert>
void BlendRun(const Sample* colours, const Sample* masks, Sample* into, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) into[i] = Blended<Invert>(into[i], colours[i], masks[i]);
}

bool Overlap(const Sample* a, std::size_t aBytes, const Sample* b, std::size_t bBytes) {
  const auto begin = reinterpret_cast<Word>(a), other = reinterpret_cast<Word>(b);
  return begin < other + bBytes && other < begin + aBytes;
}

/// Bytes from the start of a row to the end of its last pixel.
std::size_t Extent(const PlaneList& planes, std::int32_t width) {
  return std::size_t(planes.Offset[0] + (std::ptrdiff_t{width} + 1) * planes.Step);
}

}

MaskedRows::MaskedRows(MaskUse use, const PlaneList& picture, const PlaneList& mask, const PlaneList& image,
                       std::int32_t width)
    : In(picture), InMask(mask), Out(image), Width(width), Invert(use.Invert) {
  if (use.For == MaskUse::Alpha) {
    Plain = image.Count == 3 ? DrawRow<ColoursAlone>
            : use.Invert     ? DrawRow<TakeMaskAsAlpha<true>>
                             : DrawRow<TakeMaskAsAlpha<false>>;
    return;
  }
  Plain = use.Invert ? DrawRow<BlendByMask<true>> : DrawRow<BlendByMask<false>>;
  First = LeftOf(image);
  PlaneList run = image;
  for (int c = 0; c < 3; ++c) run.Offset[c] -= First;
  constexpr FamilyPair same = Pair<Family::RGB, Family::RGB, Same<3>>;
  TakeColours = RowConversion(same, AlphaRule::None, picture, run);
  TakeMask = RowConversion(same, AlphaRule::None, mask, run);
  RunBytes = std::size_t(width) * std::size_t(image.Step);
  Colours = NewBuffer(RunBytes);
  Masks = NewBuffer(RunBytes);
  // Bytes that are no colour stay.
  if (Masks) std::memset(Masks.get(), use.Invert ? 0 : 255, RunBytes);
}

void MaskedRows::operator()(const Sample* picture, const Sample* mask, Sample* image) const {
  const std::size_t bytes = Extent(Out, Width);
  const bool apart = !Overlap(picture, Extent(In, Width), image, bytes) &&
                     !Overlap(mask, Extent(InMask, Width), image, bytes);
  if (Colours && Masks && apart)
    BlendAsRun(picture, mask, image);
  else
    Plain(picture, In, mask, InMask, image, Out, Width);
}

void MaskedRows::BlendAsRun(const Sample* picture, const Sample* mask, Sample* image) const {
  TakeColours(picture, Colours.get(), Width);
  TakeMask(mask, Masks.get(), Width);
  const Sample *colours = Colours.get(), *masks = Masks.get();
  if (Invert)
    OnBestTarget<BlendRun<true>>(colours, masks, image + First, RunBytes);
  else
    OnBestTarget<BlendRun<false>>(colours, masks, image + First, RunBytes);
}

}
