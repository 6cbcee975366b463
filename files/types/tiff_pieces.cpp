#include "tiff_pieces.h"

#include <algorithm>
#include <cstring>

namespace picturezor::files {

namespace {

/// Larger pieces leave no room for several at a time.
constexpr std::int64_t LargePiece = 64 << 20;

/// Samples that are stored as they are need no other threads.
int ThreadsOf(const TIFFShape& shape, int asked) {
  const std::int64_t bytes = shape.PieceWidth() * shape.PieceHeight() * ChannelsOf(shape.Pixels);
  return shape.Packing == Compression::None || bytes >= LargePiece ? 1 : ThreadsFor(asked);
}

}

TIFFPieces::TIFFPieces(const std::filesystem::path& target, const TIFFShape& shape, int threads, Sink sink)
    : Target(target),
      Of(shape),
      Into(std::move(sink)),
      RowBytes(std::size_t(shape.Width) * std::size_t(ChannelsOf(shape.Pixels))),
      MostWaiting(ThreadsOf(shape, threads) > 1 ? 2 * std::size_t(ThreadsOf(shape, threads)) + 2 : 1),
      Encoders(std::size_t(ThreadsOf(shape, threads))),
      Pieces(ThreadsOf(shape, threads), [this](Piece& piece, int thread) { Pack(piece, thread); }) {
  Band.resize(RowBytes * std::size_t(std::min(shape.PieceHeight(), shape.Height)));
}

void TIFFPieces::Add(const std::uint8_t* row) {
  std::memcpy(Band.data() + RowBytes * std::size_t(InBand++), row, RowBytes);
  ++Begun;
  if (InBand == Of.PieceHeight() || Begun == Of.Height) Cut();
  if (Begun == Of.Height)
    while (Pieces.Size() > 0) GiveOldest();
}

void TIFFPieces::Cut() {
  const auto step = std::size_t(ChannelsOf(Of.Pixels));
  const std::size_t pieceRow = std::size_t(Of.PieceWidth()) * step;
  for (std::int64_t across = 0; across < Of.PiecesAcross(); ++across) {
    auto piece = std::make_unique<Piece>();
    // The last rows of tiles that hang over the picture's edges are repeated, which JPEG likes best.
    piece->Rows = Of.Tile ? Of.Tile : InBand;
    piece->Samples.resize(pieceRow * std::size_t(piece->Rows));
    const std::size_t at = pieceRow * std::size_t(across), used = std::min(pieceRow, RowBytes - at);
    for (std::int64_t y = 0; y < piece->Rows; ++y) {
      std::uint8_t* out = piece->Samples.data() + pieceRow * std::size_t(y);
      std::memcpy(out, Band.data() + RowBytes * std::size_t(std::min(y, InBand - 1)) + at, used);
      for (std::size_t x = used; x < pieceRow; ++x) out[x] = out[x - step];
    }
    Pieces.Put(std::move(piece));
    while (Pieces.Size() >= MostWaiting) GiveOldest();
  }
  InBand = 0;
}

void TIFFPieces::Pack(Piece& piece, int thread) {
  if (Of.Packing == Compression::None) {
    piece.Packed = std::move(piece.Samples);
    return;
  }
  if (!Of.Tile && piece.Rows != Of.RowsPerStrip) {
    // The last strip, whose height JPEG and WebP write down.
    TIFFShape last = Of;
    last.RowsPerStrip = piece.Rows;
    TIFFEncoder encoder(Target, last);
    piece.Packed = encoder.Pack(piece.Samples);
    piece.Tables = encoder.Tables();
    return;
  }
  auto& encoder = Encoders[std::size_t(thread)];
  if (!encoder) encoder = std::make_unique<TIFFEncoder>(Target, Of);
  piece.Packed = encoder->Pack(piece.Samples);
  piece.Tables = encoder->Tables();
  piece.Samples = {};
}

void TIFFPieces::GiveOldest() {
  const auto piece = Pieces.Take();
  Into(piece->Packed, piece->Tables);
}

}
