#pragma once
#include <functional>
#include <memory>
#include <vector>

#include "conveyor.h"
#include "tiff_encoder.h"

namespace picturezor::files {

/// Cuts the rows of a picture into strips or tiles and packs them on several threads.
class TIFFPieces {
 public:
  /// Gets the packed pieces in order, on the caller's thread, and `tables` with the first one.
  using Sink = std::function<void(const Bytes& piece, const Bytes& tables)>;
  TIFFPieces(const std::filesystem::path& target, const TIFFShape& shape, int threads, Sink sink);
  const TIFFShape& Shape() const { return Of; }
  /// The next row; with the last one all pieces have been given.
  void Add(const std::uint8_t* row);

 private:
  struct Piece {
    Bytes Samples;
    std::int64_t Rows = 0;
    Bytes Packed, Tables;
  };

  void Cut();
  void Pack(Piece& piece, int thread);
  void GiveOldest();

  std::filesystem::path Target;
  TIFFShape Of;
  Sink Into;
  std::size_t RowBytes, MostWaiting;
  /// The rows of the pieces side by side that aren't complete.
  Bytes Band;
  std::int64_t Begun = 0, InBand = 0;
  std::vector<std::unique_ptr<TIFFEncoder>> Encoders;
  Conveyor<Piece> Pieces;
};

}
