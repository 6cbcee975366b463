#include <algorithm>

#include "geometry/geometry.h"
#include "geometry/reversal.h"
#include "image/byte_blocks.h"
#include "image/filter.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

/// Turns a row around its middle. Pixels of both halves are exchanged; one in the middle stays.
void MirrorRow(const Reversal& reversal, Sample* row, const PictureData& picture) {
  const std::int32_t half = picture.Width / 2;
  const std::ptrdiff_t toNext = IsMirrored(picture) ? -picture.RowSize : picture.RowSize;
  reversal.Swap(row, row + std::ptrdiff_t{picture.Width - half} * picture.PixelSize, half, toNext);
}

/// Exchanges two runs of bytes, a cache line at a time.
void SwapRuns(Sample* a, Sample* b, std::ptrdiff_t bytes) {
  std::ptrdiff_t i = 0;
  for (Sample line[CacheLine]; i + CacheLine <= bytes; i += CacheLine) {
    std::memcpy(line, a + i, CacheLine);
    std::memcpy(a + i, b + i, CacheLine);
    std::memcpy(b + i, line, CacheLine);
  }
  for (; i < bytes; ++i) std::swap(a[i], b[i]);
}

/// Two rows of one picture, exchanged in place or through copies of both.
class RowExchange {
 public:
  RowExchange(PictureData& picture, const PlaneList& planes, bool reversed)
      : Of(picture),
        Planes(planes),
        Reversed(planes, planes),
        IsReversed(reversed),
        RowBytes(std::size_t(StoredRowBytes(picture))) {
    // Rows of a file may not be in the window together; those of a caller's block may overlap.
    ThroughCopies = picture.IsMapping || picture.RowSize < std::int64_t(RowBytes);
    if (!ThroughCopies) return;
    Top = NewBuffer(RowBytes);
    Bottom = NewBuffer(RowBytes);
  }
  explicit operator bool() const { return !ThroughCopies || (Top && Bottom); }
  const Reversal& Mirror() const { return Reversed; }

  bool operator()(std::int32_t top, std::int32_t bottom) {
    if (!ThroughCopies)
      return WithRows({Of, top, 1}, {Of, bottom, 1},
                      [&](const RowRun& a, const RowRun& b) { Swap(a.First, b.First); });
    const auto keep = [&](std::int32_t y, const Buffer& copy) {
      return WithRow(Of, y, [&](const Sample* row) { std::memcpy(copy.get(), row, RowBytes); });
    };
    const auto fill = [&](std::int32_t y, const Buffer& other) {
      return WithRow(Of, y, [&](Sample* row) { Copy(other.get(), row); });
    };
    if (!keep(top, Top) || !keep(bottom, Bottom)) return false;
    // On a file the window is at the bottom row now.
    return Of.IsMapping ? fill(bottom, Top) && fill(top, Bottom) : fill(top, Bottom) && fill(bottom, Top);
  }

 private:
  void Swap(Sample* a, Sample* b) const {
    if (IsReversed) return Reversed.Swap(a, b, Of.Width);
    if (FillPixels(Planes)) {
      const std::ptrdiff_t first = FirstOffset(Planes), bytes = std::ptrdiff_t{Of.Width} * Planes.Step;
      return OnBestTarget<SwapRuns>(a + first, b + first, bytes);
    }
    ForPlaneCount(Planes.Count, [&](auto n) {
      const PlaneRow<n> top(a, Planes), bottom(b, Planes);
      for (std::ptrdiff_t x = 0; x < Of.Width; ++x)
        for (int c = 0; c < n; ++c) std::swap(top(c, x), bottom(c, x));
    });
  }
  void Copy(Sample* from, Sample* into) const {
    if (IsReversed) return Reversed.Copy(from, into, Of.Width);
    ForAlikePlanes(Planes, Of.Width, [&](auto planesOn, std::ptrdiff_t width) {
      const auto in = planesOn(from), out = planesOn(into);
      for (std::ptrdiff_t x = 0; x < width; ++x)
        for (int c = 0; c < in.Count; ++c) out(c, x) = in(c, x);
    });
  }

  PictureData& Of;
  PlaneList Planes;
  Reversal Reversed;
  bool IsReversed, ThroughCopies;
  std::size_t RowBytes;
  Buffer Top, Bottom;
};

/// Exchanges the rows of both halves from the outside in, each reversed if asked for; then one in the middle
/// is reversed in itself.
void ExchangeHalves(PictureZOR* self, bool reversed) {
  PictureData& picture = DataOf(self);
  if (!Usable(picture)) return;
  MayYield(picture);
  const Group group = GroupOf(picture);
  if (group == Group::None || !Usable(picture)) return;
  RowExchange exchange(picture, PlanesOf(group, picture), reversed);
  if (!exchange) return;
  const std::int32_t half = picture.Height / 2;
  for (std::int32_t top = 0; top < half; ++top) {
    if (!exchange(top, picture.Height - 1 - top)) return;
    MayYield(picture);
  }
  if (reversed && picture.Height % 2 == 1)
    WithRow(picture, half, [&](Sample* row) { MirrorRow(exchange.Mirror(), row, picture); });
}

}

void HMirror(PictureZOR* self) {
  PictureData& picture = DataOf(self);
  if (!Usable(picture)) return;
  MayYield(picture);
  const Group group = GroupOf(picture);
  if (group == Group::None) return;
  const PlaneList planes = PlanesOf(group, picture);
  const Reversal reversal(planes, planes);
  Walk(Yielding(Into(picture))).Rows(picture.Height, [&](std::int32_t, Sample* row) {
    MirrorRow(reversal, row, picture);
  });
}

void VMirror(PictureZOR* self) { ExchangeHalves(self, false); }
void Rotate180(PictureZOR* self) { ExchangeHalves(self, true); }

PictureZOR* Rotate180(PictureZOR* self, PictureZOR* dest) {
  return RunFilter(self, dest, {.InPlace = false}, [](const FilterCall& call) {
    // Rows are read from the top where the order makes the result. Else from the bottom, so that both
    // pictures are gone through in one direction from end to end.
    const Reversal reversal(call.In, call.Out, call.SharesPixels);
    const std::int32_t width = call.Source.Width, height = call.Source.Height;
    const std::int32_t most = std::min(RowsAtOnce(call.Source), RowsAtOnce(call.Dest));
    for (std::int32_t y = 0, count; y < height; y += count) {
      count = std::min(most, height - y);
      const bool reached = WithRows({call.Source, y, count}, {call.Dest, height - y - count, count},
                                    [&](const RowRun& from, const RowRun& into) {
                                      for (std::int32_t i = 0; i < count; ++i) {
                                        const std::int32_t row = call.SharesPixels ? i : count - 1 - i;
                                        reversal.Copy(from[row], into[count - 1 - row], width);
                                      }
                                    });
      if (!reached) return false;
    }
    return true;
  });
}

}
