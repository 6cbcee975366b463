#include <algorithm>
#include <array>

#include "composition/composition.h"
#include "composition/in_layout.h"
#include "image/clip.h"
#include "image/stores.h"
#include "image/targets.h"
#include "image/walk.h"

// Every form is one loop over a run of bytes: the source's pixels and the mask's are brought into the dest's
// own layout, a stretch of a row at a time, and a byte that has to stay gets the mask 255 and the source 0,
// which leaves it as it is in both formulas.

namespace zor {
namespace {

constexpr FamilyPair CombinePairs[] = {
    Pair<Family::Gray, Family::Gray, Same<1>>,
    Pair<Family::Gray, Family::RGB, GrayToAll>,
    Pair<Family::RGB, Family::Gray, Luma>,
    Pair<Family::RGB, Family::RGB, Same<3>>,
};

constexpr Colour<1> Mean(Colour<3> c) { return {Sample((c.Of[0] + c.Of[1] + c.Of[2]) / 3)}; }
constexpr Colour<3> MeanToAll(Colour<3> c) { return GrayToAll(Mean(c)); }

/// How an image becomes a mask.
constexpr FamilyPair MeanPairs[] = {
    Pair<Family::Gray, Family::Gray, Same<1>>,
    Pair<Family::Gray, Family::RGB, GrayToAll>,
    Pair<Family::RGB, Family::Gray, Mean>,
    Pair<Family::RGB, Family::RGB, MeanToAll>,
};

/// v / 255 for v up to 255 * 255, as a product of which 16 bits are high ones. With v = 255 q + r, r from 0
/// to 254, 257 (v + 1) is 65536 q + 257 (r + 1) - q: no less than 65536 q, as q is 255 at most, and less than
/// 65536 (q + 1), as it is 65535 - q above 65536 q at most.
constexpr std::uint16_t By255(std::uint16_t v) {
  return std::uint16_t(std::uint32_t{std::uint16_t(v + 1)} * 257 >> 16);
}

template <bool PreMultiplied>
constexpr std::uint16_t Blend(Sample s, Sample m, Sample d) {
  if constexpr (PreMultiplied) return std::uint16_t(s + By255(std::uint16_t(m * d)));
  return By255(std::uint16_t(std::uint16_t(s * std::uint16_t(255 - m)) + std::uint16_t(m * d)));
}

template <bool PreMultiplied>
void BlendRun(const Sample* s, const Sample* m, Sample* d, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) d[i] = Sample(Blend<PreMultiplied>(s[i], m[i], d[i]));
}

/// A colour over gray: three results for each sample, and their luma.
template <bool PreMultiplied>
void ColourRun(const std::array<Sample, 3>& s, const Sample* m, Sample* d, std::ptrdiff_t step,
               std::ptrdiff_t count) {
  for (std::ptrdiff_t x = 0; x < count; ++x) {
    Sample& gray = d[x * step];
    const int red = Blend<PreMultiplied>(s[0], m[x * step], gray),
              green = Blend<PreMultiplied>(s[1], m[x * step], gray),
              blue = Blend<PreMultiplied>(s[2], m[x * step], gray);
    gray = Sample((red * 77 + green * 151 + blue * 28) >> 8);
  }
}

/// The pictures of a call, usable, and what is left of its block. Without a mask that is the image.
struct CombineCall {
  PictureData &Dest, &Image, &Mask;
  CopyBlock Of;
  bool PreMultiplied;
};

/// Calls run(source's pixels, mask's pixels, dest's left edge, count) for stretches of the block, each as
/// long as reading ahead of the writing doesn't show. False when a row can't be reached.
template <class Run>
bool ForStretches(const CombineCall& call, InLayout& source, InLayout& mask, Run&& run) {
  const Rectangle& rectangle = call.Of.Dest;
  const std::int32_t sourceX = call.Of.SourceX, sourceY = call.Of.SourceY;
  const bool shares = SharePixels(call.Image, call.Dest) || SharePixels(call.Mask, call.Dest);
  const std::int32_t step = call.Dest.PixelSize, left = call.Dest.LeftEdge;
  return Walk(From(call.Image, sourceY), From(call.Mask, sourceY), Yielding(Into(call.Dest, rectangle.Y)))
      .Rows(rectangle.Height,
            [&](std::int32_t y, const Sample* imageRow, const Sample* maskRow, Sample* row) {
              const Place from{sourceX, sourceY + y}, into{rectangle.X, rectangle.Y + y};
              const std::int32_t most =
                  std::min({InLayout::Most / step, ReadAhead(call.Image, from, call.Dest, into),
                            ReadAhead(call.Mask, from, call.Dest, into)});
              for (std::int32_t x = 0; x < rectangle.Width; x += most) {
                const std::int32_t count = std::min(most, rectangle.Width - x);
                run(source(imageRow, sourceX + x, count, shares), mask(maskRow, sourceX + x, count, shares),
                    row + left + std::ptrdiff_t(rectangle.X + x) * step, count);
              }
            });
}

bool BlendBlock(const CombineCall& call, InLayout& source, InLayout& mask) {
  return ForStretches(call, source, mask,
                      [&](const Sample* s, const Sample* m, Sample* d, std::int32_t count) {
                        const std::ptrdiff_t bytes = std::ptrdiff_t{count} * call.Dest.PixelSize;
                        call.PreMultiplied ? OnBestTarget<BlendRun<true>>(s, m, d, bytes)
                                           : OnBestTarget<BlendRun<false>>(s, m, d, bytes);
                      });
}

/// The bytes of a pixel, 8 at most.
using Pixel = std::array<Sample, 8>;

Pixel EachByte(Sample value) {
  Pixel pixel;
  pixel.fill(value);
  return pixel;
}

/// What brings the pixels of a picture into the dest's layout.
RowConversion IntoDest(std::span<const FamilyPair> pairs, const PictureData& picture, const PictureData& dest,
                       bool withAlpha) {
  const AlphaRule rule = withAlpha && picture.HasAlpha && dest.HasAlpha ? AlphaRule::Copy : AlphaRule::None;
  return Find(pairs, FamilyOf(picture), PlanesOf(GroupOf(picture), picture), FamilyOf(dest),
              InPixel(PlanesOf(GroupOf(dest), dest)), rule);
}

std::array<Sample, 3> BytesOf(Integer colour) {
  return {Sample(colour >> 16), Sample(colour >> 8), Sample(colour)};
}

/// The pixel with a colour in the dest's colour planes, as luma where that is gray.
Pixel WithColour(Pixel pixel, Integer colour, const PictureData& dest) {
  const PlaneList planes = InPixel(PlanesOf(GroupOf(dest), dest));
  const auto [red, green, blue] = BytesOf(colour);
  if (dest.IsGray)
    pixel[std::size_t(planes.Offset[0])] = Luma({red, green, blue}).Of[0];
  else
    for (std::size_t c = 0; c < 3; ++c) pixel[std::size_t(planes.Offset[c])] = BytesOf(colour)[c];
  return pixel;
}

InLayout InDest(const RowConversion& convert, const PictureData& picture, const PictureData& dest,
                const Pixel& rest) {
  return {convert, PlanesOf(GroupOf(picture), picture), dest.PixelSize, rest.data()};
}

bool ThroughMask(const CombineCall& call) {
  const PictureData& dest = call.Dest;
  const RowConversion ofImage = IntoDest(CombinePairs, call.Image, dest, true),
                      ofMask = IntoDest(CombinePairs, call.Mask, dest, true);
  if (!ofImage || !ofMask) return true;
  Pixel rest = EachByte(0);
  if (dest.HasAlpha) {
    const PlaneList planes = InPixel(PlanesOf(GroupOf(dest), dest));
    rest[std::size_t(planes.Offset[std::size_t(planes.Count) - 1])] = 255;
  }
  InLayout source = InDest(ofImage, call.Image, dest, rest),
           mask = InDest(ofMask, call.Mask, dest, EachByte(255));
  return BlendBlock(call, source, mask);
}

bool WithForeColour(const CombineCall& call, Integer colour) {
  const PictureData& dest = call.Dest;
  const RowConversion ofImage = IntoDest(MeanPairs, call.Image, dest, false);
  if (!ofImage) return true;
  InLayout source = InDest({}, call.Image, dest, WithColour(EachByte(0), colour, dest)),
           mask = InDest(ofImage, call.Image, dest, EachByte(255));
  if (!dest.IsGray) return BlendBlock(call, source, mask);
  const std::int32_t step = dest.PixelSize, place = InPixel(PlanesOf(Group::Gray, dest)).Offset[0];
  const std::array<Sample, 3> colours = BytesOf(colour);
  return ForStretches(call, source, mask, [&](const Sample*, const Sample* m, Sample* d, std::int32_t count) {
    call.PreMultiplied ? ColourRun<true>(colours, m + place, d + place, step, count)
                       : ColourRun<false>(colours, m + place, d + place, step, count);
  });
}

bool WithMaskColour(const CombineCall& call, Integer colour) {
  const PictureData& dest = call.Dest;
  const RowConversion ofImage = IntoDest(CombinePairs, call.Image, dest, false);
  if (!ofImage) return true;
  InLayout source = InDest(ofImage, call.Image, dest, EachByte(0)),
           mask = InDest({}, call.Image, dest, WithColour(EachByte(255), colour, dest));
  return BlendBlock(call, source, mask);
}

/// The way in of the three forms with a mask or a colour; runs body with what is left of the block.
template <class Body>
bool Enter(PictureData& dest, PictureData& image, PictureData* mask, bool preMultiplied,
           const CopyBlock& asked, Body&& body) {
  if (!image.Valid || (mask && !mask->Valid)) return false;
  if (mask && (mask->Width != image.Width || mask->Height != image.Height)) return false;
  if (!Usable(dest)) return false;
  MayYield(dest);
  if (!Usable(image) || (mask && !Usable(*mask))) return false;
  MayYield(image);
  const CopyBlock block = CopyRect(dest, image, asked);
  return !block.Dest.Empty() && body(CombineCall{dest, image, mask ? *mask : image, block, preMultiplied});
}

}

Boolean Combine(PictureZOR* self, PictureZOR* image, PictureZOR* mask, Integer destX, Integer destY,
                Integer sourceX, Integer sourceY, Integer width, Integer height, Boolean useColours) {
  return Combine(self, image, false, mask, destX, destY, sourceX, sourceY, width, height, useColours, -1, -1);
}
Boolean Combine(PictureZOR* self, PictureZOR* image, PictureZOR* mask, Integer destX, Integer destY,
                Integer sourceX, Integer sourceY, Integer width, Integer height, Boolean useColours,
                Integer foreColour) {
  return Combine(self, image, false, mask, destX, destY, sourceX, sourceY, width, height, useColours,
                 foreColour, -1);
}
Boolean Combine(PictureZOR* self, PictureZOR* image, PictureZOR* mask, Integer destX, Integer destY,
                Integer sourceX, Integer sourceY, Integer width, Integer height, Boolean useColours,
                Integer foreColour, Integer maskColour) {
  return Combine(self, image, false, mask, destX, destY, sourceX, sourceY, width, height, useColours,
                 foreColour, maskColour);
}
Boolean Combine(PictureZOR* self, PictureZOR* image, Boolean preMultipliedSource, PictureZOR* mask,
                Integer destX, Integer destY, Integer sourceX, Integer sourceY, Integer width, Integer height,
                Boolean useColours) {
  return Combine(self, image, preMultipliedSource, mask, destX, destY, sourceX, sourceY, width, height,
                 useColours, -1, -1);
}
Boolean Combine(PictureZOR* self, PictureZOR* image, Boolean preMultipliedSource, PictureZOR* mask,
                Integer destX, Integer destY, Integer sourceX, Integer sourceY, Integer width, Integer height,
                Boolean useColours, Integer foreColour) {
  return Combine(self, image, preMultipliedSource, mask, destX, destY, sourceX, sourceY, width, height,
                 useColours, foreColour, -1);
}

Boolean Combine(PictureZOR* self, PictureZOR* image, Boolean preMultipliedSource, PictureZOR* mask,
                Integer destX, Integer destY, Integer sourceX, Integer sourceY, Integer width, Integer height,
                Boolean useColours, Integer foreColour, Integer maskColour) {
  if (!image || width < 1 || height < 1) return false;
  if (!mask && foreColour < 0 && maskColour < 0)
    return CopyPixels(self, image, destX, destY, width, height, sourceX, sourceY);
  const CopyBlock asked{{destX, destY, width, height}, sourceX, sourceY};
  return Enter(DataOf(self), DataOf(image), mask ? &DataOf(mask) : nullptr, preMultipliedSource != 0, asked,
               [&](const CombineCall& call) {
                 if (mask) return ThroughMask(call);
                 if (maskColour < 0) return WithForeColour(call, foreColour);
                 return WithMaskColour(call, useColours ? maskColour : 0);
               });
}

}
