#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <numeric>

#include "composition/composition.h"
#include "image/byte_blocks.h"
#include "image/clip.h"
#include "image/formats.h"
#include "image/groups.h"
#include "image/walk.h"

namespace zor {
namespace {

/// Calls work(left edge in the row, width) for each row of the part of the rectangle that lies in the
/// picture. The edge is that of the pixels as the offsets count them.
template <class Work>
void ForRectangle(PictureData& picture, Rectangle asked, Work&& work) {
  if (!Usable(picture)) return;
  const Rectangle r = FilterRect(picture, asked);
  if (r.Empty()) return;
  MayYield(picture);
  Walk(Yielding(Into(picture, r.Y))).Rows(r.Height, [&](std::int32_t, Sample* row) {
    work(row + std::ptrdiff_t(r.X) * picture.PixelSize, r.Width);
  });
}

Rectangle WholeOf(PictureZOR* self) { return {0, 0, DataOf(self).Width, DataOf(self).Height}; }

/// A value for each plane of a group.
using Values = std::array<Sample, 5>;

/// A pixel of N bytes, as often as there is room.
template <int N>
class RepeatedPixel {
 public:
  RepeatedPixel(const PlaneList& planes, const Values& values) {
    Sample pixel[N];
    for (std::size_t c = 0; c < N; ++c) pixel[planes.Offset[c] - LeftOf(planes)] = values[c];
    for (std::size_t i = 0; i < sizeof Pixels; ++i) Pixels[i] = pixel[i % N];
  }

  /// `streamed` where the run is one of many that don't fit in the caches together.
  void Fill(Sample* run, std::ptrdiff_t bytes, bool streamed) const {
    const std::ptrdiff_t head = streamed ? std::min(-InCacheLine(run) & (CacheLine - 1), bytes) : 0;
    std::memcpy(run, Pixels, std::size_t(head));
    const Sample* pixels = Pixels + head % N;
    const std::ptrdiff_t periods = (bytes - head) / Period;
    streamed ? FillPeriods(run + head, periods, pixels, StreamBlock)
             : FillPeriods(run + head, periods, pixels, StoreBlock);
    const std::ptrdiff_t done = head + periods * Period;
    std::memcpy(run + done, pixels, std::size_t(bytes - done));
  }

 private:
  /// After so many bytes blocks begin with the same byte of the pixel again.
  static constexpr std::ptrdiff_t Period = N * BlockBytes;

  template <class Store>
  static void FillPeriods(Sample* into, std::ptrdiff_t count, const Sample* pixels, Store&& store) {
    Block blocks[N];
    for (int i = 0; i < N; ++i) blocks[i] = LoadBlock(pixels + i * BlockBytes);
    for (; count > 0; --count, into += Period)
      for (int i = 0; i < N; ++i) store(into + i * BlockBytes, blocks[i]);
  }

  Sample Pixels[std::max(Period, CacheLine) + N];
};

template <int N>
void FillPlanes(Sample* row, const PlaneList& planes, const Values& values, std::int32_t width) {
  const PlaneRow<N> out(row, planes);
  for (std::ptrdiff_t x = 0; x < width; ++x)
    for (int c = 0; c < N; ++c) out(c, x) = values[std::size_t(c)];
}

void Fill(PictureData& picture, const Rectangle& asked, Group group, const Values& values) {
  const PlaneList planes = PlanesOf(group, picture);
  const auto pixel = std::ptrdiff_t{planes.Step};
  const std::int32_t left = picture.LeftEdge;
  if (!FillPixels(planes))
    return ForPlaneCount(planes.Count, [&](auto n) {
      ForRectangle(picture, asked,
                   [&](Sample* row, std::int32_t width) { FillPlanes<n>(row, planes, values, width); });
    });
  const bool alike = std::all_of(values.begin(), values.begin() + planes.Count,
                                 [&](Sample value) { return value == values[0]; });
  if (alike)
    return ForRectangle(picture, asked, [&](Sample* row, std::int32_t width) {
      std::memset(row + left, values[0], std::size_t(width * pixel));
    });
  const Rectangle filled = FilterRect(picture, asked);
  const bool streamed = !filled.Empty() && std::int64_t{filled.Width} * pixel * filled.Height >= Streamed;
  ForPlaneCount(planes.Count, [&](auto n) {
    const RepeatedPixel<n> pixels(planes, values);
    ForRectangle(picture, asked,
                 [&](Sample* row, std::int32_t width) { pixels.Fill(row + left, width * pixel, streamed); });
  });
  if (streamed) EndStream();
}

void FillColour(PictureZOR* self, const Rectangle& asked, Integer red, Integer green, Integer blue) {
  PictureData& picture = DataOf(self);
  if (!HasPlanes(Group::RGB, picture, false)) return;
  Fill(picture, asked, Group::RGB, {Sample(red), Sample(green), Sample(blue)});
}

void FillColour(PictureZOR* self, const Rectangle& asked, Integer red, Integer green, Integer blue,
                Integer alpha) {
  PictureData& picture = DataOf(self);
  if (!picture.HasAlpha) return FillColour(self, asked, red, green, blue);
  if (!HasPlanes(Group::RGB, picture, false)) return;
  Fill(picture, asked, Group::RGBAlpha, {Sample(red), Sample(green), Sample(blue), Sample(alpha)});
}

/// The planes in the order that noise comes to them.
PlaneList NoiseOrder(const PictureData& picture) {
  PlaneList planes = PlanesOf(GroupOf(picture), picture);
  const auto begin = planes.Offset.begin(), end = begin + planes.Count;
  if (picture.IsCMYK && picture.HasAlpha)
    std::rotate(begin, end - 1, end);
  else if (!picture.IsCMYK && FillPixels(planes))
    std::iota(begin, end, picture.LeftEdge);
  return planes;
}

/// Whether a picture shows all bytes of its pixels. A view of channels has its parent's pixels under the code
/// of a format with pixels of its own.
bool ShowsWholePixels(const PictureData& picture) {
  PictureData own{};
  return InitImageLayout(&own, 1, 1, std::uint32_t(picture.ImageFormat)) &&
         own.PixelSize == picture.PixelSize;
}

}

void FillRect(PictureZOR* self, Integer value) {
  const Rectangle whole = WholeOf(self);
  FillRect(self, 0, 0, whole.Width, whole.Height, value);
}

void FillRect(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Integer value) {
  PictureData& picture = DataOf(self);
  Values values;
  values.fill(Sample(value));
  Fill(picture, {x, y, width, height}, GroupOf(picture), values);
}

void FillRectRGB(PictureZOR* self, Integer red, Integer green, Integer blue) {
  FillColour(self, WholeOf(self), red, green, blue);
}
void FillRectRGB(PictureZOR* self, Integer red, Integer green, Integer blue, Integer alpha) {
  FillColour(self, WholeOf(self), red, green, blue, alpha);
}
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Integer red,
                 Integer green, Integer blue) {
  FillColour(self, {x, y, width, height}, red, green, blue);
}
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Integer red,
                 Integer green, Integer blue, Integer alpha) {
  FillColour(self, {x, y, width, height}, red, green, blue, alpha);
}
void FillRectRGB(PictureZOR* self, Color fillColor) {
  FillColour(self, WholeOf(self), fillColor >> 16, fillColor >> 8, fillColor);
}
void FillRectRGB(PictureZOR* self, Color fillColor, Integer alpha) {
  FillColour(self, WholeOf(self), fillColor >> 16, fillColor >> 8, fillColor, alpha);
}
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Color fillColor) {
  FillColour(self, {x, y, width, height}, fillColor >> 16, fillColor >> 8, fillColor);
}
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Color fillColor,
                 Integer alpha) {
  FillColour(self, {x, y, width, height}, fillColor >> 16, fillColor >> 8, fillColor, alpha);
}

void FillRectRandom(PictureZOR* self) {
  const Rectangle whole = WholeOf(self);
  FillRectRandom(self, 0, 0, whole.Width, whole.Height);
}

void FillRectRandom(PictureZOR* self, Integer x, Integer y, Integer width, Integer height) {
  PictureData& picture = DataOf(self);
  const PlaneList planes = NoiseOrder(picture);
  ForPlaneCount(planes.Count, [&](auto n) {
    ForRectangle(picture, {x, y, width, height}, [&](Sample* row, std::int32_t count) {
      const PlaneRow<n> out(row, planes);
      for (std::ptrdiff_t i = 0; i < count; ++i)
        for (int c = 0; c < n; ++c) out(c, i) = Sample(std::rand());
    });
  });
}

void ClearRect(PictureZOR* self) {
  PictureData& picture = DataOf(self);
  if (picture.Parent) return ClearRect(self, 0, 0, picture.Width, picture.Height);
  if (!Usable(picture)) return;
  MayYield(picture);
  // Whole rows follow one another in memory.
  const std::int32_t most = picture.YieldTicks > 0 ? 1 : std::max(RowsAtOnce(picture), 1);
  bool reached = true;
  for (std::int32_t y = 0; reached && y < picture.Height; y += most) {
    const std::int32_t count = std::min(most, picture.Height - y);
    reached = WithRows({picture, y, count}, [&](const RowRun& rows) {
      std::memset(std::min(rows[0], rows[count - 1]), 0, std::size_t(count) * std::size_t(picture.RowSize));
    });
    MayYield(picture);
  }
}

void ClearRect(PictureZOR* self, Integer x, Integer y, Integer width, Integer height) {
  PictureData& picture = DataOf(self);
  if (!ShowsWholePixels(picture)) return FillRect(self, x, y, width, height, 0);
  ForRectangle(picture, {x, y, width, height}, [&](Sample* row, std::int32_t count) {
    std::memset(row + picture.LeftEdge, 0, std::size_t(count) * std::size_t(picture.PixelSize));
  });
}

}
