#pragma once
#include <cstdint>
#include <memory>

#include "image_file.h"
#include "tiff_handle.h"

namespace picturezor::files {

/// How the samples of a file lie.
struct TIFFLayout {
  std::int64_t Width = 0, Height = 0;
  std::uint16_t Bits = 1, Samples = 1, Photometric = 0, Compression = 0;
  bool Planar = false, Tiled = false, Associated = false;
  int Colours = 0;
  /// The sample that is alpha, or -1.
  int AlphaAt = -1;
  /// Samples that stand side by side.
  int Interleaved() const { return Planar ? 1 : Samples; }
  int Planes() const { return Planar ? Samples : 1; }
  std::size_t RowBytes(std::int64_t pixels) const {
    return std::size_t((pixels * Interleaved() * Bits + 7) / 8);
  }
};

/// Gives the decoded rows of one plane, packed as in the file, 16-bit samples in the machine's order.
class TIFFPlane {
 public:
  virtual ~TIFFPlane() = default;
  /// What is going to be read, row by row; all of it as long as nothing is chosen.
  virtual void Select(const Rect&) {}
  /// The column that rows begin with: that of the part, or one before it.
  virtual std::int64_t FirstColumn() const { return 0; }
  /// A row, until the next is asked for.
  virtual const std::uint8_t* Row(std::int64_t y) = 0;
  /// Bytes from one on of some rows, each `bytes` long, `stride` from one to the next.
  virtual void ReadRows(std::int64_t y, std::size_t first, std::size_t bytes, std::uint8_t* into,
                        std::ptrdiff_t stride, std::int32_t count);
};

/// `header` outlives it. Strips and tiles that are compressed are decoded on several threads.
std::unique_ptr<TIFFPlane> OpenPlane(const Input& input, const TIFFHandle& header, const TIFFLayout& layout,
                                     int plane, const ReadOptions& options);

}
