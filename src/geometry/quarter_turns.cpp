#include <algorithm>

#include "geometry/geometry.h"
#include "geometry/transposition.h"
#include "image/clip.h"
#include "image/filter.h"
#include "image/walk.h"

namespace zor {
namespace {

enum class Direction { CounterClockwise, Clockwise };

/// A tile: so many rows of the source and so many columns, which are rows of the destination.
struct TileSize {
  std::int32_t Rows, Columns;
};

/// A part of the source that becomes a part of the destination, with all its rows in both in the address
/// space.
struct Tile {
  const FilterCall& Call;
  Direction Way;
  Rectangle Source;

  std::int32_t FirstDestRow() const {
    return Way == Direction::Clockwise ? Source.X : Call.Source.Width - Source.X - Source.Width;
  }
  /// As a transposition: clockwise its source is read from the bottom row up, else its destination is written
  /// so.
  Transposition Between(const RowRun& from, const RowRun& into) const {
    const bool clockwise = Way == Direction::Clockwise;
    const std::int32_t lastRow = Source.Height - 1, lastColumn = Source.Width - 1;
    const std::int32_t left = clockwise ? Call.Source.Height - Source.Y - Source.Height : Source.Y;
    return {from[clockwise ? lastRow : 0] + std::ptrdiff_t{Source.X} * Call.In.Step,
            clockwise ? -from.Stride : from.Stride,
            into[clockwise ? 0 : lastColumn] + std::ptrdiff_t{left} * Call.Out.Step,
            clockwise ? into.Stride : -into.Stride,
            Source.Width,
            Source.Height};
  }
  bool Turn() const {
    return WithRows({Call.Source, Source.Y, Source.Height}, {Call.Dest, FirstDestRow(), Source.Width},
                    [&](const RowRun& from, const RowRun& into) {
                      const Transposition pixels = Between(from, into);
                      // Where what is written shows in other places too, the order makes the result.
                      Call.SharesPixels ? InOrder(pixels) : Transpose(pixels, Call.In, Call.Out);
                    });
  }
  /// Row by row from the top, pixel by pixel from the left.
  void InOrder(const Transposition& pixels) const {
    ForPlaneCount(Call.In.Count, [&](auto n) {
      for (std::ptrdiff_t i = 0; i < pixels.Height; ++i) {
        const std::ptrdiff_t y = Way == Direction::Clockwise ? pixels.Height - 1 - i : i;
        const PlaneRow<n> in(pixels.From + y * pixels.FromStride, Call.In);
        for (std::ptrdiff_t x = 0; x < pixels.Width; ++x) {
          const PlaneRow<n> out(pixels.Into + x * pixels.IntoStride, Call.Out);
          for (int c = 0; c < n; ++c) out(c, y) = in(c, x);
        }
      }
    });
  }
};

constexpr TileSize OnePixel{1, 1};

/// The largest tiles whose rows are in the address space together. Where the pictures share samples the order
/// counts, and tiles are squares that fit in the smaller window.
TileSize LargestTiles(const FilterCall& call) {
  if (!call.SharesPixels) return {MostRowsTogether(call.Source), MostRowsTogether(call.Dest)};
  const std::int32_t edge = std::min(call.Source.RowsPerBlock, call.Dest.RowsPerBlock) - 2;
  return edge < 1 ? OnePixel : TileSize{edge, edge};
}

template <class SizeOfTiles>
PictureZOR* Turn(PictureZOR* self, PictureZOR* dest, Direction way, SizeOfTiles&& sizeOfTiles) {
  return RunFilter(self, dest, {.InPlace = false, .Turned = true}, [&](const FilterCall& call) {
    const std::int32_t width = call.Source.Width, height = call.Source.Height;
    const TileSize most = sizeOfTiles(call);
    const auto turn = [&](std::int64_t x, std::int64_t y) {
      const std::int32_t left = std::int32_t(x), top = std::int32_t(y);
      return Tile{
          call, way, {left, top, std::min(most.Columns, width - left), std::min(most.Rows, height - top)}}
          .Turn();
    };
    if (call.SharesPixels || most.Columns == 1) {
      for (std::int64_t y = 0; y < height; y += most.Rows)
        for (std::int64_t x = 0; x < width; x += most.Columns)
          if (!turn(x, y)) return false;
      return true;
    }
    // All tiles of the same written rows first: a page is read again for less than it is written again.
    for (std::int64_t x = 0; x < width; x += most.Columns)
      for (std::int64_t y = 0; y < height; y += most.Rows)
        if (!turn(x, y)) return false;
    return true;
  });
}

TileSize NoTiles(const FilterCall&) { return OnePixel; }

}

PictureZOR* Rotate90(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::CounterClockwise, LargestTiles);
}
PictureZOR* Rotate270(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::Clockwise, LargestTiles);
}
PictureZOR* Rotate90slow(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::CounterClockwise, NoTiles);
}
PictureZOR* Rotate270slow(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::Clockwise, NoTiles);
}

}
