#pragma once
#include <cstdint>
#include <memory>
#include <span>

#include "image_file.h"
#include "tiff_handle.h"

namespace picturezor::files {

/// One picture of a TIFF file as it is going to be stored.
struct TIFFShape {
  std::int64_t Width = 0, Height = 0;
  Format Pixels = Format::Unknown;
  Compression Packing = Compression::LZW;
  std::optional<int> Level;
  int Quality = 90;
  /// The edge of tiles, or 0 and the rows of a strip.
  std::int64_t Tile = 0, RowsPerStrip = 0;
  /// A smaller copy of the picture before it.
  bool Reduced = false;

  std::int64_t PieceWidth() const { return Tile ? Tile : Width; }
  std::int64_t PieceHeight() const { return Tile ? Tile : RowsPerStrip; }
  std::int64_t PiecesAcross() const { return (Width + PieceWidth() - 1) / PieceWidth(); }
};

/// The tags that say how the samples are stored.
void SetShape(TIFFHandle& file, const TIFFShape& shape);

/// Packs strips or tiles in memory, as they stand in a file of that shape.
class TIFFEncoder {
 public:
  TIFFEncoder(const std::filesystem::path& target, const TIFFShape& shape);
  /// `samples` come back changed.
  Bytes Pack(std::span<std::uint8_t> samples);
  /// What all pieces share when they are packed as JPEG, after the first.
  Bytes Tables() const;

 private:
  bool Tiled;
  Bytes Written;
  std::unique_ptr<TIFFHandle> File;
};

}
