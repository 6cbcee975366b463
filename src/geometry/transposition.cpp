#include "geometry/transposition.h"

#include <algorithm>

#include "image/byte_blocks.h"

// A band of rows becomes a band of columns, which takes whole cache lines of each row that is written. It
// goes through squares in registers: 16 x 16 for gray, 4 x 4 for wider pixels, each of them in a lane of 4
// bytes. A large result is streamed to memory, line by line: a line isn't read to be overwritten, and needs
// no place in the caches, where a column of lines would push each other out. Where the rows or columns are no
// multiple of a band or a piece, the last one starts earlier and writes some samples a second time.

namespace zor {
namespace {

/// Rows of a band: they fill whole cache lines, however many bytes a pixel has.
constexpr int Band = 64;
/// Columns that are done through all bands before the next ones: written rows whose pages are in use.
constexpr std::ptrdiff_t Strip = 1024;
/// Bytes that a source row is asked for ahead.
constexpr std::ptrdiff_t Ahead = 128;

/// Three bytes a pixel to lanes of four, and four pixels of lanes back to 48 bytes without gaps.
constexpr int Spread(int j) { return j % 4 == 3 ? 0 : j / 4 * 3 + j % 4; }
template <int Third>
constexpr int Packed(int j) {
  // Byte 16 * Third + j of the 48 comes of two neighbouring vectors of 12.
  const int byte = Third * int(BlockBytes) + j, pixel = byte / 3;
  return (pixel / 4 - Third) * int(BlockBytes) + pixel % 4 * 4 + byte % 3;
}

/// Rows of a piece, and columns.
constexpr int PieceHeight = 16;
template <int Step>
constexpr int PieceWidth = Step == 1 ? 16 : 4;

template <int Step>
void TransposePiece(const Sample* from, std::ptrdiff_t fromStride, Sample* into, std::ptrdiff_t intoStride) {
  if constexpr (Step == 1) {
    Block rows[16];
    for (int y = 0; y < 16; ++y) rows[y] = LoadBlock(from + y * fromStride);
    TransposeSquare(rows);
    for (int x = 0; x < 16; ++x) StoreBlock(into + x * intoStride, rows[x]);
  } else {
    Quads squares[4][4];
    for (int y = 0; y < PieceHeight; ++y) {
      const Block row = LoadBlock(from + y * fromStride);
      squares[y / 4][y % 4] = Quads(Step == 3 ? Shuffled<Spread>(row, row) : row);
    }
    for (auto& square : squares) TransposeSquare(square);
    for (int x = 0; x < 4; ++x) {
      Sample* row = into + x * intoStride;
      const auto pixels = [&](int i) { return Block(squares[i][x]); };
      if constexpr (Step == 4) {
        for (int i = 0; i < 4; ++i) StoreBlock(row + i * BlockBytes, pixels(i));
      } else {
        StoreBlock(row, Shuffled<Packed<0>>(pixels(0), pixels(1)));
        StoreBlock(row + BlockBytes, Shuffled<Packed<1>>(pixels(1), pixels(2)));
        StoreBlock(row + 2 * BlockBytes, Shuffled<Packed<2>>(pixels(2), pixels(3)));
      }
    }
  }
}

/// Columns of a band, from left to right.
template <int Step, int Rows>
void TransposeBand(const Sample* from, std::ptrdiff_t fromStride, Sample* into, std::ptrdiff_t intoStride,
                   std::ptrdiff_t width, bool streamed) {
  constexpr int columns = PieceWidth<Step>, bytes = Rows * Step;
  for (std::ptrdiff_t next = 0; next < width; next += columns) {
    const std::ptrdiff_t x = std::min(next, width - columns);
    alignas(CacheLine) Sample lines[columns * bytes];
    for (int y = 0; y < Rows; y += PieceHeight) {
      const Sample* piece = from + y * fromStride + x * Step;
      if (x * Step % CacheLine < columns * Step)
        for (int i = 0; i < PieceHeight; ++i) Prefetch(piece + i * fromStride, Ahead);
      TransposePiece<Step>(piece, fromStride, lines + y * Step, bytes);
    }
    for (int column = 0; column < columns; ++column) {
      Sample* row = into + (x + column) * intoStride;
      const Sample* line = lines + column * bytes;
      for (int i = 0; i < bytes; i += int(BlockBytes))
        streamed ? StreamBlock(row + i, LoadBlock(line + i)) : StoreBlock(row + i, LoadBlock(line + i));
    }
  }
}

/// All rows of the columns that pieces cover, at least a piece wide and a band high.
/// Bands from `firstStreamed` on are streamed, unless it is negative.
template <int Step, int Rows>
void TransposeBands(const Sample* from, std::ptrdiff_t fromStride, Sample* into, std::ptrdiff_t intoStride,
                    std::ptrdiff_t width, std::ptrdiff_t height, std::ptrdiff_t firstStreamed) {
  for (std::ptrdiff_t next = 0; next < width; next += Strip) {
    const std::ptrdiff_t left = std::min<std::ptrdiff_t>(next, width - PieceWidth<Step>);
    const std::ptrdiff_t columns = std::min(Strip, width - left);
    const auto band = [&](std::ptrdiff_t top, bool streamed) {
      TransposeBand<Step, Rows>(from + top * fromStride + left * Step, fromStride,
                                into + left * intoStride + top * Step, intoStride, columns, streamed);
    };
    if (firstStreamed > 0) band(0, false);
    std::ptrdiff_t top = std::max<std::ptrdiff_t>(firstStreamed, 0);
    for (; top + Rows <= height; top += Rows) band(top, firstStreamed >= 0);
    if (top < height) band(height - Rows, false);
  }
  EndStream();
}

/// The first pixel of a written row that starts a cache line, as it does in all rows; -1 where there is none
/// or the result is small.
template <int Step>
std::ptrdiff_t FirstStreamed(const Sample* into, std::ptrdiff_t stride, std::ptrdiff_t bytes) {
  if (bytes < Streamed || stride % CacheLine != 0) return -1;
  for (std::ptrdiff_t x = 0; x < CacheLine; ++x)
    if (InCacheLine(into + x * Step) == 0) return x;
  return -1;
}

/// Any layouts, in squares that stay in the cache.
template <int N>
void TransposePlain(const Transposition& pixels, const PlaneList& in, const PlaneList& out) {
  constexpr std::ptrdiff_t side = 32;
  for (std::ptrdiff_t top = 0; top < pixels.Height; top += side)
    for (std::ptrdiff_t left = 0; left < pixels.Width; left += side)
      for (std::ptrdiff_t x = left; x < std::min(left + side, pixels.Width); ++x) {
        const PlaneRow<N> row(pixels.Into + x * pixels.IntoStride, out);
        for (std::ptrdiff_t y = top; y < std::min(top + side, pixels.Height); ++y) {
          const PlaneRow<N> column(pixels.From + y * pixels.FromStride, in);
          for (int c = 0; c < N; ++c) row(c, y) = column(c, x);
        }
      }
}

/// In pieces where they fit; the rest plainly.
template <int Step>
void TransposeInPieces(const Transposition& pixels, const PlaneList& in, const PlaneList& out) {
  const Sample* from = pixels.From + FirstOffset(in);
  Sample* into = pixels.Into + FirstOffset(out);
  // The row of a piece is read to the end of a block.
  const std::ptrdiff_t room = pixels.Width * Step - BlockBytes;
  const std::ptrdiff_t covered = room < 0 ? 0 : room / Step + PieceWidth<Step>;
  Transposition rest = pixels;
  if (covered > 0 && pixels.Height >= Band) {
    const std::ptrdiff_t first = FirstStreamed<Step>(into, pixels.IntoStride, covered * pixels.Height * Step);
    OnBestTarget<TransposeBands<Step, Band>>(from, pixels.FromStride, into, pixels.IntoStride, covered,
                                             pixels.Height, first);
  } else if (covered > 0 && pixels.Height >= PieceHeight) {
    OnBestTarget<TransposeBands<Step, PieceHeight>>(from, pixels.FromStride, into, pixels.IntoStride, covered,
                                                    pixels.Height, std::ptrdiff_t{-1});
  } else {
    return TransposePlain<Step>(pixels, in, out);
  }
  rest.From += covered * Step;
  rest.Into += covered * pixels.IntoStride;
  rest.Width -= covered;
  TransposePlain<Step>(rest, in, out);
}

}

void Transpose(const Transposition& pixels, const PlaneList& in, const PlaneList& out) {
  const bool alike = FillPixelsAlike(in, out);
  if (alike && in.Step == 1) return TransposeInPieces<1>(pixels, in, out);
  if (alike && in.Step == 3 && ShufflesBytes()) return TransposeInPieces<3>(pixels, in, out);
  if (alike && in.Step == 4) return TransposeInPieces<4>(pixels, in, out);
  ForPlaneCount(in.Count, [&](auto n) { TransposePlain<n>(pixels, in, out); });
}

}
