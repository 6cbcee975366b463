#pragma once
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <span>
#include <vector>

#include "conveyor.h"
#include "image_file.h"

namespace picturezor::files {

/// A segment that stands before the pixels of a JPEG.
struct JPEGMarker {
  int Code;
  Bytes Data;
};
using JPEGMarkers = std::vector<JPEGMarker>;

/// Makes a baseline JPEG out of its rows, band by band on several threads. Nothing leads from one band into
/// the next but the coding of means by differences, which a restart marker between them begins anew: so bands
/// are coded as files of their own, and the file has the headers of the first. Its pixels are those that it
/// would have without the markers.
class JPEGBands {
 public:
  using Sink = std::function<void(std::span<const std::uint8_t>)>;
  /// `info` has the size, pixels, density and profile. `sink` gets the file in pieces, on the caller's
  /// thread.
  JPEGBands(const std::filesystem::path& target, const ImageInfo& info, JPEGMarkers head, int quality,
            int threads, Sink sink);
  /// The next row; with the last one all of the file has been given.
  void Add(const std::uint8_t* row);

 private:
  struct Band {
    Bytes Rows;
    std::int32_t Count = 0;
    std::int64_t Number = 0;
    Bytes Packed;
  };

  void Pack(Band& band) const;
  void GiveOldest();

  const std::filesystem::path Path;
  const ImageInfo Info;
  const JPEGMarkers Head;
  const int Quality;
  const Sink Into;
  std::size_t RowBytes;
  std::int32_t RowsPerBand;
  unsigned RestartInterval;
  std::size_t MostWaiting;
  std::int64_t Begun = 0, Numbers = 0;
  std::unique_ptr<Band> Open;
  Conveyor<Band> Bands;
};

}
