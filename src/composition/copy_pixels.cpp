#include <algorithm>
#include <cstring>

#include "composition/composition.h"
#include "image/clip.h"
#include "image/conversion.h"
#include "image/stores.h"
#include "image/walk.h"

namespace zor {
namespace {

// Between RGB and CMYK there is no way.
constexpr FamilyPair CopyPairs[] = {
    Pair<Family::Gray, Family::Gray, Same<1>>,     Pair<Family::Gray, Family::RGB, GrayToAll>,
    Pair<Family::Gray, Family::CMYK, GrayToBlack>, Pair<Family::RGB, Family::Gray, Luma>,
    Pair<Family::RGB, Family::RGB, Same<3>>,       Pair<Family::CMYK, Family::Gray, BlackToGray>,
    Pair<Family::CMYK, Family::CMYK, Same<4>>,
};

/// A block that goes from one picture into another, by rows.
class BlockCopy {
 public:
  BlockCopy(PictureData& dest, PictureData& source, const CopyBlock& block, const RowConversion& convert)
      : Dest(dest), Source(source), Of(block), Convert(convert) {}

  /// Between pictures that share no samples.
  bool Straight() {
    if (const std::int32_t most = RowsWithoutGaps(); most > 1) return InRuns(most);
    return Walk(From(Source, Of.SourceY), Yielding(Into(Dest, Of.Dest.Y)))
        .Rows(Of.Dest.Height,
              [&](std::int32_t, const Sample* from, Sample* into) { ConvertRow(from, into); });
  }

  /// Reads the whole block before it writes.
  bool AtOnce() {
    bool done = Reserve(Of.Dest.Height);
    for (std::int32_t y = 0; done && y < Of.Dest.Height; ++y) done = Read(y, y);
    for (std::int32_t y = 0; done && y < Of.Dest.Height; ++y) done = Write(y, y);
    return done;
  }

  /// Between pictures of one store whose rows don't overlap, with two rows in memory. Row y of the dest is
  /// row first + y of the source's block, or first - y if one of them is mirrored.
  bool InOneStore() {
    const std::int32_t height = Of.Dest.Height;
    const std::int64_t way = StoreRowOf(Source, 1) - StoreRowOf(Source, 0);
    const bool mirrored = way != StoreRowOf(Dest, 1) - StoreRowOf(Dest, 0);
    const std::int64_t first = (StoreRowOf(Dest, Of.Dest.Y) - StoreRowOf(Source, Of.SourceY)) * way;
    bool done = Reserve(2);
    for (std::int32_t n = 0; done && n < height; ++n) {
      // A row that is still to be read is written later: from the last one on where they move down.
      const std::int32_t y = !mirrored && first > 0 ? height - 1 - n : n;
      // Mirrored rows change places in pairs, once.
      const std::int64_t other = mirrored ? first - y : y;
      if (other >= 0 && other < y) continue;
      const bool isPair = other > y && other < height;
      done = Read(y, 0) && (!isPair || Read(std::int32_t(other), 1)) && Write(y, 0) &&
             (!isPair || Write(std::int32_t(other), 1));
    }
    return done;
  }

 private:
  /// How many rows are one long row in either picture; 1 where they aren't, or somebody waits for each row.
  std::int32_t RowsWithoutGaps() const {
    const auto isWhole = [&](const PictureData& picture) {
      return std::int64_t{Of.Dest.Width} * picture.PixelSize == picture.RowSize && !IsMirrored(picture);
    };
    if (!isWhole(Source) || !isWhole(Dest) || Dest.YieldTicks > 0) return 1;
    constexpr std::int32_t mostPixels = 1 << 28;
    return std::min({RowsAtOnce(Source), RowsAtOnce(Dest), mostPixels / Of.Dest.Width});
  }
  bool InRuns(std::int32_t most) {
    bool reached = true;
    for (std::int32_t y = 0, rows = 0; reached && y < Of.Dest.Height; y += rows) {
      rows = std::min(most, Of.Dest.Height - y);
      reached = WithRows({Source, Of.SourceY + y, rows}, {Dest, Of.Dest.Y + y, rows},
                         [&](const RowRun& from, const RowRun& into) {
                           Convert(from.First, into.First, Of.Dest.Width * rows);
                         });
    }
    return reached;
  }
  void ConvertRow(const Sample* from, Sample* into) const {
    Convert(from + std::ptrdiff_t(Of.SourceX) * Source.PixelSize,
            into + std::ptrdiff_t(Of.Dest.X) * Dest.PixelSize, Of.Dest.Width);
  }
  bool Reserve(std::int32_t rows) {
    const std::int64_t row = StoredRowBytes(Source);
    RowBytes = std::size_t(row);
    Rows = NewBuffer(rows, row);
    return Rows != nullptr;
  }
  bool Read(std::int32_t y, std::int32_t slot) {
    return WithRow(Source, Of.SourceY + y, [&](const Sample* row) {
      std::memcpy(Rows.get() + std::size_t(slot) * RowBytes, row, RowBytes);
    });
  }
  bool Write(std::int32_t y, std::int32_t slot) {
    const bool done = WithRow(Dest, Of.Dest.Y + y, [&](Sample* row) {
      ConvertRow(Rows.get() + std::size_t(slot) * RowBytes, row);
    });
    MayYield(Dest);
    return done;
  }

  PictureData &Dest, &Source;
  CopyBlock Of;
  const RowConversion& Convert;
  std::size_t RowBytes = 0;
  Buffer Rows;
};

}

Boolean CopyPixels(PictureZOR* self, PictureZOR* source) {
  const PictureData& dest = DataOf(self);
  return CopyPixels(self, source, 0, 0, dest.Width, dest.Height, 0, 0);
}

Boolean CopyPixels(PictureZOR* self, PictureZOR* source, Integer destX, Integer destY, Integer destWidth,
                   Integer destHeight) {
  return CopyPixels(self, source, destX, destY, destWidth, destHeight, 0, 0);
}

Boolean CopyPixels(PictureZOR* self, PictureZOR* source, Integer destX, Integer destY, Integer destWidth,
                   Integer destHeight, Integer sourceX, Integer sourceY) {
  if (!source) return false;
  PictureData &dest = DataOf(self), &from = DataOf(source);
  if (!from.Valid || !Usable(dest)) return false;
  MayYield(dest);
  if (!Usable(from)) return false;
  MayYield(from);
  const CopyBlock block = CopyRect(dest, from, {{destX, destY, destWidth, destHeight}, sourceX, sourceY});
  const RowConversion convert = Find(CopyPairs, from, dest);
  if (block.Dest.Empty() || !convert) return false;
  BlockCopy copy(dest, from, block, convert);
  if (!SharePixels(dest, from)) return copy.Straight();
  return dest.Samples == from.Samples && RowsAreApart(dest) && RowsAreApart(from) ? copy.InOneStore()
                                                                                  : copy.AtOnce();
}

}
