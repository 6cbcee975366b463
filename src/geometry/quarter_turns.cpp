#include <algorithm>
#include <cmath>

#include "geometry/geometry.h"
#include "geometry/transposition.h"
#include "image/byte_blocks.h"
#include "image/clip.h"
#include "image/file_regions.h"
#include "image/filter.h"
#include "image/walk.h"

namespace zor {
namespace {

enum class Direction { CounterClockwise, Clockwise };

/// A tile: so many rows of the source and so many columns, which are rows of the destination.
struct TileSize {
  std::int32_t Rows, Columns;
};

/// A part of the source that becomes a part of the destination.
struct Tile {
  const FilterCall& Call;
  Direction Way;
  Rectangle Source;

  std::int32_t FirstDestRow() const {
    return Way == Direction::Clockwise ? Source.X : Call.Source.Width - Source.X - Source.Width;
  }
  std::int32_t FirstDestColumn() const {
    return Way == Direction::Clockwise ? Call.Source.Height - Source.Y - Source.Height : Source.Y;
  }
  /// As a transposition, between the places of its first pixels: clockwise its source is read from the bottom
  /// row up, else its destination is written so.
  Transposition Between(const RowRun& from, const RowRun& into) const {
    const bool clockwise = Way == Direction::Clockwise;
    return {from[clockwise ? Source.Height - 1 : 0],
            clockwise ? -from.Stride : from.Stride,
            into[clockwise ? 0 : Source.Width - 1],
            clockwise ? into.Stride : -into.Stride,
            Source.Width,
            Source.Height};
  }
  /// With all its rows in both in the address space.
  bool Turn() const {
    return WithRows({Call.Source, Source.Y, Source.Height}, {Call.Dest, FirstDestRow(), Source.Width},
                    [&](const RowRun& from, const RowRun& into) {
                      const Transposition pixels = Between(AtColumn(from, Source.X, Call.In),
                                                           AtColumn(into, FirstDestColumn(), Call.Out));
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
  static RowRun AtColumn(const RowRun& rows, std::int32_t x, const PlaneList& planes) {
    return {rows.First + std::ptrdiff_t{x} * planes.Step, rows.Stride};
  }
};

/// Pixels in memory of their own, as they stand in a picture.
class Pixels {
 public:
  Pixels(std::int32_t width, std::int32_t height, const PlaneList& planes)
      : Stride(Padded(std::int64_t{width} * planes.Step)), Memory(NewBuffer(height, Stride)), Of(planes) {
    for (std::int32_t& offset : Of.Offset) offset -= LeftOf(planes);
  }
  explicit operator bool() const { return Memory != nullptr; }
  RowRun Rows() const { return {Memory.get(), Stride}; }
  const PlaneList& Planes() const { return Of; }

  static std::int64_t Padded(std::int64_t bytes) { return (bytes + CacheLine - 1) / CacheLine * CacheLine; }

 private:
  std::ptrdiff_t Stride;
  Buffer Memory;
  PlaneList Of;
};

/// The part of the source that is composed in memory, as rows of the destination, and then written to its
/// file; empty where those are mapped instead. It takes as much memory as a region beside the window may.
/// Whole rows of the destination need the fewest writes; where the source is read from a file too, pieces as
/// long on one side as on the other make the fewest calls.
TileSize LargestComposed(const FilterCall& call) {
  if (!call.Dest.IsMapping || call.SharesPixels || !FillPixels(call.Out)) return {0, 0};
  const std::int64_t most = MostBytesBeside(call.Dest);
  const double edge = std::sqrt(double(most / call.Out.Step));
  const std::int32_t rows =
      call.Source.IsMapping ? std::int32_t(std::min<double>(edge, call.Source.Height)) : call.Source.Height;
  if (rows == 0) return {0, 0};
  const std::int64_t columns = most / Pixels::Padded(std::int64_t{rows} * call.Out.Step);
  return {rows, std::int32_t(std::min<std::int64_t>(columns, call.Source.Width))};
}

/// Composes so large a part at a time. By way of mappings each page that is written costs a fault and is
/// cleared first, and one that is read costs a fault for each time that it is needed again; where the system
/// has the file in small pages that takes many times as long as the copies do.
bool TurnComposed(const FilterCall& call, Direction way, const TileSize& most) {
  const std::int32_t width = call.Source.Width, height = call.Source.Height;
  const bool mapped = call.Source.IsMapping;
  const std::int32_t band = mapped ? std::min(128, most.Rows) : most.Rows;
  const Pixels part(mapped ? most.Columns : 0, mapped ? band : 0, call.In),
      composed(most.Rows, most.Columns, call.Out);
  if (!part || !composed) return false;
  const auto turn = [&](const Rectangle& whole) {
    const Tile all{call, way, whole};
    for (std::int32_t done = 0; done < whole.Height; done += band) {
      const Tile tile{call, way, {whole.X, whole.Y + done, whole.Width, std::min(band, whole.Height - done)}};
      const auto transpose = [&](const RowRun& from, const PlaneList& in) {
        const RowRun into = Tile::AtColumn(composed.Rows(), tile.FirstDestColumn() - all.FirstDestColumn(),
                                           composed.Planes());
        Transpose(tile.Between(from, into), in, composed.Planes());
      };
      if (!mapped) {
        if (!WithRows({call.Source, tile.Source.Y, tile.Source.Height}, [&](const RowRun& from) {
              transpose(Tile::AtColumn(from, whole.X, call.In), call.In);
            }))
          return false;
      } else {
        if (!ReadPixels(call.Source, tile.Source, part.Rows().First, part.Rows().Stride)) return false;
        transpose(part.Rows(), part.Planes());
      }
    }
    const Rectangle written{all.FirstDestColumn(), all.FirstDestRow(), whole.Height, whole.Width};
    return WritePixels(call.Dest, written, composed.Rows().First, composed.Rows().Stride);
  };
  for (std::int64_t x = 0; x < width; x += most.Columns)
    for (std::int64_t y = 0; y < height; y += most.Rows) {
      const auto left = std::int32_t(x), top = std::int32_t(y);
      if (!turn({left, top, std::min(most.Columns, width - left), std::min(most.Rows, height - top)}))
        return false;
    }
  return true;
}

constexpr TileSize OnePixel{1, 1};

/// The largest tiles whose rows are in the address space together. Where the pictures share samples the order
/// counts, and tiles are squares that fit in the smaller window.
TileSize LargestTiles(const FilterCall& call) {
  if (!call.SharesPixels) return {MostRowsTogether(call.Source), MostRowsTogether(call.Dest)};
  const std::int32_t edge = std::min(call.Source.RowsPerBlock, call.Dest.RowsPerBlock) - 2;
  return edge < 1 ? OnePixel : TileSize{edge, edge};
}

enum class Form { Fast, Slow };

PictureZOR* Turn(PictureZOR* self, PictureZOR* dest, Direction way, Form form) {
  return RunFilter(self, dest, {.InPlace = false, .Turned = true}, [&](const FilterCall& call) {
    const TileSize composed = form == Form::Fast ? LargestComposed(call) : TileSize{0, 0};
    if (composed.Columns > 0) return TurnComposed(call, way, composed);
    const std::int32_t width = call.Source.Width, height = call.Source.Height;
    const TileSize most = form == Form::Fast ? LargestTiles(call) : OnePixel;
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

}

PictureZOR* Rotate90(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::CounterClockwise, Form::Fast);
}
PictureZOR* Rotate270(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::Clockwise, Form::Fast);
}
PictureZOR* Rotate90slow(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::CounterClockwise, Form::Slow);
}
PictureZOR* Rotate270slow(PictureZOR* self, PictureZOR* dest) {
  return Turn(self, dest, Direction::Clockwise, Form::Slow);
}

}
