#include "tiff_planes.h"

#include <algorithm>
#include <cstring>
#include <vector>

#include "conveyor.h"
#include "failure.h"

namespace picturezor::files {

void TIFFPlane::ReadRows(std::int64_t y, std::size_t first, std::size_t bytes, std::uint8_t* into,
                         std::ptrdiff_t stride, std::int32_t count) {
  for (std::int32_t i = 0; i < count; ++i) std::memcpy(into + i * stride, Row(y + i) + first, bytes);
}

namespace {

/// Strips and tiles of more bytes are decoded one at a time, strips row by row.
constexpr std::int64_t LargePiece = 8 << 20;

std::unique_ptr<TIFFHandle> OpenForPixels(const Input& input, const TIFFLayout& layout,
                                          std::int64_t memoryLimit) {
  auto file = TIFFHandle::Open(input, memoryLimit);
  if (layout.Compression == COMPRESSION_JPEG) file->Set(TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
  file->ReadingPixels();
  return file;
}

std::int64_t RowsPerStrip(const TIFFHandle& file, const TIFFLayout& layout) {
  const auto rows = std::int64_t{file.Get<std::uint32_t>(TIFFTAG_ROWSPERSTRIP, UINT32_MAX)};
  return std::clamp<std::int64_t>(rows, 1, layout.Height);
}

/// Strips of any compression and size. libtiff holds one strip as it is compressed.
class LongStrips : public TIFFPlane {
 public:
  LongStrips(const Input& input, const TIFFLayout& layout, int plane, std::int64_t memoryLimit)
      : File(OpenForPixels(input, layout, memoryLimit)), Plane(std::uint16_t(plane)) {
    Line.resize(std::size_t(TIFFScanlineSize64(*File)));
    Rows = RowsPerStrip(*File, layout);
  }

  const std::uint8_t* Row(std::int64_t y) override {
    // The rows of a strip come one after the other.
    const std::int64_t strip = y - y % Rows;
    for (std::int64_t row = Next >= strip && Next <= y ? Next : strip; row <= y; ++row)
      File->Check(TIFFReadScanline(*File, Line.data(), std::uint32_t(row), Plane) == 1);
    Next = y + 1;
    return Line.data();
  }

 private:
  std::unique_ptr<TIFFHandle> File;
  std::uint16_t Plane;
  std::int64_t Rows, Next = 0;
  Bytes Line;
};

/// Strips without compression are read row by row, however large they are.
class PlainStrips : public TIFFPlane {
 public:
  PlainStrips(const Input& input, const TIFFHandle& file, const TIFFLayout& layout, int plane)
      : From(input), Header(file), Of(layout), Rows(RowsPerStrip(file, layout)) {
    FirstStrip = plane * ((layout.Height + Rows - 1) / Rows);
    RowSize = layout.RowBytes(layout.Width);
    Reversed = file.Get<std::uint16_t>(TIFFTAG_FILLORDER, FILLORDER_MSB2LSB) == FILLORDER_LSB2MSB;
  }

  const std::uint8_t* Row(std::int64_t y) override {
    Line.resize(RowSize);
    ReadRows(y, 0, RowSize, Line.data(), 0, 1);
    return Line.data();
  }

  void ReadRows(std::int64_t y, std::size_t first, std::size_t bytes, std::uint8_t* into,
                std::ptrdiff_t stride, std::int32_t count) override {
    for (std::int32_t done = 0; done < count;) {
      // Rows of a strip that are wanted whole come together.
      const bool together = bytes == RowSize && stride == std::ptrdiff_t(RowSize);
      const std::int64_t inStrip = (y + done) % Rows;
      const auto rows = together ? std::int32_t(std::min<std::int64_t>(count - done, Rows - inStrip)) : 1;
      Read(y + done, first, {into + done * stride, bytes * std::size_t(rows)}, rows);
      done += rows;
    }
  }

 private:
  void Read(std::int64_t y, std::size_t first, std::span<std::uint8_t> into, std::int32_t rows) {
    const auto strip = std::uint32_t(FirstStrip + y / Rows);
    const std::uint64_t at = std::uint64_t(y % Rows) * RowSize;
    const std::uint64_t start = TIFFGetStrileOffset(Header, strip);
    const std::uint64_t size = TIFFGetStrileByteCount(Header, strip);
    Header.Check();
    if (at + RowSize * std::uint64_t(rows) > size || start > std::uint64_t(From.Size()))
      throw Failure(From.Name(), "corrupt TIFF: a strip is too short for its rows");
    if (From.ReadAt(std::int64_t(start + at + first), into) < into.size())
      throw Failure(From.Name(), "the TIFF file is cut off");
    if (Reversed) TIFFReverseBits(into.data(), tmsize_t(into.size()));
    if (Of.Bits == 16 && TIFFIsByteSwapped(Header))
      TIFFSwabArrayOfShort(reinterpret_cast<std::uint16_t*>(into.data()), tmsize_t(into.size() / 2));
  }

  Input From;
  const TIFFHandle& Header;
  TIFFLayout Of;
  std::int64_t Rows, FirstStrip;
  std::size_t RowSize;
  Bytes Line;
  bool Reversed;
};

/// Where the strips or tiles of a plane lie.
struct Grid {
  std::int64_t Width, Height, Across;

  Grid(const TIFFHandle& file, const TIFFLayout& layout)
      : Width(layout.Tiled ? file.Get<std::uint32_t>(TIFFTAG_TILEWIDTH, 0) : layout.Width),
        Height(layout.Tiled ? file.Get<std::uint32_t>(TIFFTAG_TILELENGTH, 0) : RowsPerStrip(file, layout)),
        Across(layout.Tiled && Width > 0 ? (layout.Width + Width - 1) / Width : 1) {}
  std::int64_t Bytes(const TIFFLayout& layout) const { return std::int64_t(layout.RowBytes(Width)) * Height; }
};

/// Strips or tiles, decoded ahead of the rows that are asked for. A row of tiles is in memory at a time.
class Pieces : public TIFFPlane {
 public:
  Pieces(const Input& input, const TIFFLayout& layout, const Grid& grid, int plane, std::int64_t memoryLimit,
         int threads)
      : From(input),
        Of(layout),
        Each(grid),
        Plane(std::uint16_t(plane)),
        Limit(memoryLimit),
        PieceRow(layout.RowBytes(grid.Width)),
        MostAhead(threads > 1 ? 2 * std::size_t(threads) + 2 : 1),
        Files(std::size_t(threads)),
        Decoded(threads, [this](Piece& piece, int thread) { Decode(piece, thread); }) {
    Select({0, 0, std::int32_t(layout.Width), std::int32_t(layout.Height)});
  }

  void Select(const Rect& part) override {
    Left = part.X / Each.Width;
    Across = (part.X + part.Width + Each.Width - 1) / Each.Width - Left;
    EndBand = (std::int64_t{part.Y} + part.Height + Each.Height - 1) / Each.Height;
    InBand = -1;
    Restart(0);
  }
  std::int64_t FirstColumn() const override { return Left * Each.Width; }

  const std::uint8_t* Row(std::int64_t y) override {
    if (y / Each.Height != InBand) Fill(y / Each.Height);
    return Band.data() + PieceRow * std::size_t(Across * (y % Each.Height));
  }

 private:
  struct Piece {
    std::int64_t Band, Column;
    Bytes Samples;
  };

  std::int64_t RowsOf(std::int64_t band) const {
    return std::min(Each.Height, Of.Height - band * Each.Height);
  }

  /// From a band on.
  void Restart(std::int64_t band) {
    Decoded.Clear();
    Next = band * Across;
  }

  void Fill(std::int64_t band) {
    InBand = -1;
    // Rows that were asked for out of their order.
    if (Next - std::int64_t(Decoded.Size()) != band * Across) Restart(band);
    if (Of.Tiled) Band.resize(PieceRow * std::size_t(Across * RowsOf(band)));
    for (std::int64_t column = 0; column < Across; ++column) {
      for (; Decoded.Size() < MostAhead && Next < EndBand * Across; ++Next) {
        if (!Spare) Spare = std::make_unique<Piece>();
        Spare->Band = Next / Across;
        Spare->Column = Left + Next % Across;
        Decoded.Put(std::move(Spare));
      }
      Spare = Decoded.Take();
      if (!Of.Tiled) {
        std::swap(Band, Spare->Samples);
        continue;
      }
      for (std::int64_t row = 0; row < RowsOf(band); ++row)
        std::memcpy(&Band[PieceRow * std::size_t(row * Across + column)],
                    &Spare->Samples[PieceRow * std::size_t(row)], PieceRow);
    }
    InBand = band;
  }

  void Decode(Piece& piece, int thread) {
    auto& file = Files[std::size_t(thread)];
    if (!file) file = OpenForPixels(From, Of, Limit);
    const std::int64_t rows = Of.Tiled ? Each.Height : RowsOf(piece.Band);
    const auto size = tmsize_t(PieceRow) * rows;
    piece.Samples.resize(std::size_t(size));
    const auto y = std::uint32_t(piece.Band * Each.Height), x = std::uint32_t(piece.Column * Each.Width);
    const tmsize_t got =
        Of.Tiled
            ? TIFFReadEncodedTile(*file, TIFFComputeTile(*file, x, y, 0, Plane), piece.Samples.data(), size)
            : TIFFReadEncodedStrip(*file, TIFFComputeStrip(*file, y, Plane), piece.Samples.data(), size);
    file->Check(got == size);
  }

  Input From;
  TIFFLayout Of;
  Grid Each;
  std::uint16_t Plane;
  std::int64_t Limit;
  std::size_t PieceRow, MostAhead;
  /// The columns of pieces that are wanted, and the band behind the last one.
  std::int64_t Left = 0, Across = 1, EndBand = 0;
  /// The band at hand, or -1, and the piece that is put next, counted along bands.
  std::int64_t InBand = -1, Next = 0;
  Bytes Band;
  std::unique_ptr<Piece> Spare;
  std::vector<std::unique_ptr<TIFFHandle>> Files;
  Conveyor<Piece> Decoded;
};

}

std::unique_ptr<TIFFPlane> OpenPlane(const Input& input, const TIFFHandle& header, const TIFFLayout& layout,
                                     int plane, const ReadOptions& options) {
  if (!layout.Tiled && layout.Compression == COMPRESSION_NONE)
    return std::make_unique<PlainStrips>(input, header, layout, plane);
  const std::int64_t limit = options.MemoryLimit;
  const Grid grid(header, layout);
  if (layout.Tiled) {
    if (grid.Width < 1 || grid.Height < 1 || layout.Bits * layout.Interleaved() * grid.Width % 8 != 0 ||
        TIFFTileSize64(header) < std::uint64_t(grid.Bytes(layout)))
      throw Failure(input.Name(), "corrupt TIFF: tiles of a size that can't be");
    // Short pictures don't fill their tiles.
    const std::int64_t rows = std::min(grid.Height, layout.Height);
    RequireWithinLimit(input.Name(),
                       std::int64_t(layout.RowBytes(grid.Width)) * (grid.Across * rows + grid.Height), limit,
                       "a TIFF with tiles of this size");
  } else {
    // By the number of its samples a pixel, a row can be far larger than the picture made of it.
    RequireWithinLimit(input.Name(), std::int64_t(layout.RowBytes(layout.Width)), limit,
                       "a row of this TIFF");
  }
  const std::int64_t bytes = grid.Bytes(layout);
  const int threads = ThreadsFor(options.Threads);
  const bool large = bytes > LargePiece || bytes * (2 * threads + 3) > limit;
  if (large && !layout.Tiled) return std::make_unique<LongStrips>(input, layout, plane, limit);
  return std::make_unique<Pieces>(input, layout, grid, plane, limit, large ? 1 : threads);
}

}
