#include "geometry/transposition.h"

#include <algorithm>

#include "geometry/blocks.h"

// Written rows take whole cache lines, and the band of source rows that they come from is read from left to
// right. Gray goes in squares of 16 x 16, wider pixels in squares of 4 x 4 with each pixel in a lane of 4
// bytes.

namespace zor {
namespace {

/// Rows of a band.
constexpr std::ptrdiff_t Band = 64;

/// Of two vectors, the low or the high halves, alternating by Unit bytes.
template <int Unit, int Half>
constexpr int Interleaved(int j) {
  const int unit = j / Unit;
  return unit % 2 * int(BlockBytes) + Half * int(BlockBytes) / 2 + unit / 2 * Unit + j % Unit;
}

/// Transposes a square of Units, BlockBytes / Unit of them on each side. A stage interleaves the rows of the
/// first half with those of the second.
template <int Unit>
void TransposeSquare(Block (&rows)[BlockBytes / Unit]) {
  constexpr int side = int(BlockBytes) / Unit;
  for (int stage = 1; stage < side; stage *= 2) {
    Block mixed[side];
    for (int i = 0; i < side / 2; ++i) {
      mixed[2 * i] = Shuffled<Interleaved<Unit, 0>>(rows[i], rows[i + side / 2]);
      mixed[2 * i + 1] = Shuffled<Interleaved<Unit, 1>>(rows[i], rows[i + side / 2]);
    }
    std::copy_n(mixed, side, rows);
  }
}

/// Three bytes a pixel to lanes of four, and four pixels of lanes back to 48 bytes without gaps.
constexpr int Spread(int j) { return j % 4 == 3 ? 0 : j / 4 * 3 + j % 4; }
template <int Third>
constexpr int Packed(int j) {
  // Byte 16 * Third + j of the 48 comes of two neighbouring vectors of 12.
  const int byte = Third * int(BlockBytes) + j, pixel = byte / 3;
  return (pixel / 4 - Third) * int(BlockBytes) + pixel % 4 * 4 + byte % 3;
}

/// Rows of a square, and columns.
template <int Step>
constexpr int SquareHeight = 16;
template <int Step>
constexpr int SquareWidth = Step == 1 ? 16 : 4;

template <int Step>
void TransposePiece(const Sample* from, std::ptrdiff_t fromStride, Sample* into, std::ptrdiff_t intoStride) {
  if constexpr (Step == 1) {
    Block rows[16];
    for (int y = 0; y < 16; ++y) rows[y] = LoadBlock(from + y * fromStride);
    TransposeSquare<1>(rows);
    for (int x = 0; x < 16; ++x) StoreBlock(into + x * intoStride, rows[x]);
  } else {
    Block squares[4][4];
    for (int y = 0; y < 16; ++y) {
      const Block row = LoadBlock(from + y * fromStride);
      squares[y / 4][y % 4] = Step == 3 ? Shuffled<Spread>(row, row) : row;
    }
    for (auto& square : squares) TransposeSquare<4>(square);
    for (int x = 0; x < 4; ++x) {
      Sample* row = into + x * intoStride;
      if constexpr (Step == 4) {
        for (int i = 0; i < 4; ++i) StoreBlock(row + i * BlockBytes, squares[i][x]);
      } else {
        StoreBlock(row, Shuffled<Packed<0>>(squares[0][x], squares[1][x]));
        StoreBlock(row + BlockBytes, Shuffled<Packed<1>>(squares[1][x], squares[2][x]));
        StoreBlock(row + 2 * BlockBytes, Shuffled<Packed<2>>(squares[2][x], squares[3][x]));
      }
    }
  }
}

/// The part of a rectangle that whole pieces cover, whose sides are multiples of a piece's.
template <int Step>
void TransposePieces(const Sample* from, std::ptrdiff_t fromStride, Sample* into, std::ptrdiff_t intoStride,
                     std::ptrdiff_t width, std::ptrdiff_t height) {
  for (std::ptrdiff_t top = 0; top < height; top += Band)
    for (std::ptrdiff_t x = 0; x < width; x += SquareWidth<Step>)
      for (std::ptrdiff_t y = top; y < std::min(top + Band, height); y += SquareHeight<Step>)
        TransposePiece<Step>(from + y * fromStride + x * Step, fromStride, into + x * intoStride + y * Step,
                             intoStride);
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

/// Takes whole pieces and gives back what is left: the columns at the right, and the rows below.
template <int Step>
void TransposeInPieces(const Transposition& pixels, const PlaneList& in, const PlaneList& out) {
  // A row of the last piece is read to the end of its 16 bytes.
  const std::ptrdiff_t readable =
      pixels.Width - (BlockBytes / Step - SquareWidth<Step> + (Step == 3 ? 1 : 0));
  const std::ptrdiff_t width = std::max<std::ptrdiff_t>(readable, 0) / SquareWidth<Step> * SquareWidth<Step>;
  const std::ptrdiff_t height = pixels.Height / SquareHeight<Step> * SquareHeight<Step>;
  OnBestTarget<TransposePieces<Step>>(static_cast<const Sample*>(pixels.From + FirstOffset(in)),
                                      pixels.FromStride, pixels.Into + FirstOffset(out), pixels.IntoStride,
                                      width, height);
  Transposition right = pixels, below = pixels;
  right.From += width * Step;
  right.Into += width * pixels.IntoStride;
  right.Width -= width;
  below.From += height * pixels.FromStride;
  below.Into += height * Step;
  below.Width = width;
  below.Height -= height;
  TransposePlain<Step>(right, in, out);
  TransposePlain<Step>(below, in, out);
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
