#pragma once
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/types.h>

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace picturezor::tests {

using Bytes = std::vector<std::uint8_t>;
using Arguments = std::vector<std::string>;

Arguments operator+(Arguments first, const Arguments& more);
/// The words of a command line; '' is an empty one.
Arguments Words(const std::string& line);

/// Pixels as they stand in a file: 1 to 4 samples a pixel, or ink for 4 in CMYK.
struct Raster {
  int Width = 0, Height = 0, Channels = 0;
  Bytes Samples;
  bool operator==(const Raster&) const = default;
};

/// Every sample different from its neighbours, the same each time.
Raster Noise(int width, int height, int channels);
/// Soft waves, which JPEG keeps nearly as they are.
Raster Waves(int width, int height, int channels);
/// The largest difference of two samples; 256 for different shapes.
int Difference(const Raster& a, const Raster& b);

// Files are written and read by the libraries themselves and not by the program's own code.
void WritePNG(const std::filesystem::path& file, const Raster& raster);
Raster ReadPNG(const std::filesystem::path& file);

struct JPEGExtras {
  int Quality = 95;
  bool Progressive = false;
  /// The EXIF tag, where it isn't 0.
  int Orientation = 0;
  int DensityPerInch = 0;
  Bytes Profile{};
};
/// Four channels are CMYK as it is usual in files: 255 is no ink.
void WriteJPEG(const std::filesystem::path& file, const Raster& raster, const JPEGExtras& extras = {});
Raster ReadJPEG(const std::filesystem::path& file);

struct TIFFExtras {
  int Orientation = 1;
  int Compression = 1;
  int RowsPerStrip = 7;
  /// Tiles of this edge, instead of strips.
  int Tile = 0;
  bool Planar = false, CMYK = false, Premultiplied = false;
  /// 16 bits: each sample v stands as v * 257 + shift. Below 8, its upper bits.
  int Bits = 8, Shift = 0;
  int FillOrder = 1;
  /// libtiff's: "w", "wb" big-endian, "wl" little-endian, "w8" BigTIFF.
  std::string Mode = "w";
  float DensityPerInch = 0;
  Bytes Profile{};
};
void WriteTIFF(const std::filesystem::path& file, const Raster& raster, const TIFFExtras& extras = {});
Raster ReadTIFF(const std::filesystem::path& file);

/// A gray TIFF without compression, below 4 GiB and black, which takes no room on the disk; but white from a
/// row on.
void WriteEmptyTIFF(const std::filesystem::path& file, std::uint32_t width, std::uint32_t height,
                    std::uint32_t whiteFrom = UINT32_MAX);

Bytes ReadBytes(const std::filesystem::path& file);
void WriteBytes(const std::filesystem::path& file, const Bytes& bytes);
/// A colour profile of 532 bytes without content, for "RGB " or "GRAY".
Bytes Profile(const std::string& space);

struct Outcome {
  /// The exit code, or minus the number of the signal.
  int Code = 0;
  std::string Out, Error;
};

/// Runs the program in a directory of its own, with the temporary files in another one. Both are gone
/// afterwards, and the latter has to be empty after each test.
class CommandTest : public testing::Test {
 protected:
  CommandTest();
  ~CommandTest() override;
  void TearDown() override;

  std::filesystem::path At(const std::string& name) const { return Directory / name; }
  Outcome Run(const Arguments& arguments, std::int64_t fileSizeLimit = 0) const;
  /// One that has to work. Gives what it wrote to standard error.
  std::string Do(const Arguments& arguments) const;
  /// One that has to fail with one line that starts with the file's name and holds `reason`, leaving nothing.
  void Fail(const Arguments& arguments, const std::string& file, const std::string& reason) const;
  pid_t Start(const Arguments& arguments, int out, int error, std::int64_t fileSizeLimit = 0) const;
  static int WaitFor(pid_t process);
  std::vector<std::string> Files() const;

  std::filesystem::path Directory, Temporary;
};

}
