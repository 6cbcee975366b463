#include "image/clip.h"

#include <algorithm>

namespace zor {
namespace {

/// One axis of a rectangle or block, in 64 bits, since any 32-bit numbers may be asked for.
struct Span {
  std::int64_t At, Count, SourceAt = 0;

  void TurnForward() {
    if (Count >= 0) return;
    At += Count;
    Count = -Count;
  }
  void CutBelowZero() {
    if (At >= 0) return;
    SourceAt -= At;
    Count += At;
    At = 0;
  }
  /// Leaves what lies below the bound, from `at` on; 0 lines where nothing does.
  void CutAbove(std::int64_t at, std::int32_t bound) {
    Count = std::max<std::int64_t>(std::min(Count, bound - at), 0);
  }
};

Span ClipAxis(std::int64_t at, std::int64_t count, std::int32_t size) {
  Span span{at, count};
  span.TurnForward();
  span.CutBelowZero();
  span.CutAbove(span.At, size);
  return span;
}

Span ClipAxes(std::int64_t at, std::int64_t count, std::int64_t sourceAt, std::int32_t size,
              std::int32_t sourceSize) {
  Span span{at, count, sourceAt};
  if (sourceAt < 0) {
    span.At += sourceAt;
    span.Count += sourceAt;
    span.SourceAt = 0;
  }
  span.TurnForward();
  span.CutBelowZero();
  span.CutAbove(span.At, size);
  span.CutAbove(span.SourceAt, sourceSize);
  return span;
}

/// An empty span may lie beyond 32 bits; it says no more than that nothing is left.
Rectangle Clipped(const Span& columns, const Span& rows) {
  if (columns.Count < 1 || rows.Count < 1) return {};
  return {std::int32_t(columns.At), std::int32_t(rows.At), std::int32_t(columns.Count),
          std::int32_t(rows.Count)};
}

}

Rectangle FilterRect(const PictureData& picture, Rectangle r) {
  return Clipped(ClipAxis(r.X, r.Width, picture.Width), ClipAxis(r.Y, r.Height, picture.Height));
}

CopyBlock CopyRect(const PictureData& dest, const PictureData& source, CopyBlock block) {
  return CopyRect(dest, source.Width, source.Height, block);
}

CopyBlock CopyRect(const PictureData& dest, std::int32_t sourceWidth, std::int32_t sourceHeight,
                   CopyBlock block) {
  const Span columns = ClipAxes(block.Dest.X, block.Dest.Width, block.SourceX, dest.Width, sourceWidth);
  const Span rows = ClipAxes(block.Dest.Y, block.Dest.Height, block.SourceY, dest.Height, sourceHeight);
  const Rectangle clipped = Clipped(columns, rows);
  if (clipped.Empty()) return {};
  return {clipped, std::int32_t(columns.SourceAt), std::int32_t(rows.SourceAt)};
}

}
