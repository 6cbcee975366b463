#pragma once
#include <cstdint>
#include <filesystem>
#include <map>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "input.h"
#include "picturezor/picture.h"

namespace picturezor::files {

struct FileType;
struct ReadOptions;

/// Pixels per inch.
struct Resolution {
  double X = 0, Y = 0;
};

/// Pixels across and down.
struct Extent {
  std::int32_t Width = 0, Height = 0;
};

/// What goes with the pixels of a file.
struct ImageInfo {
  /// As stored, before the orientation is applied.
  std::int32_t Width = 0, Height = 0;
  /// G, GA, RGB, RGBA, CMYK or CMYKA. Alpha is not multiplied into the colours, and a CMYK sample is an
  /// amount of ink: 255 is full ink.
  Format Pixels = Format::Unknown;
  /// Bits of a sample in the file.
  int Bits = 8;
  /// As in EXIF: 1 is upright, 5 to 8 have rows and columns exchanged.
  int Orientation = 1;
  Bytes Profile;
  std::optional<Resolution> Density;
  /// Notes of cameras and programs: EXIF from its byte order mark on, XMP as text, IPTC as its records.
  Bytes Exif, Xmp, Iptc;
  /// Pictures in the file; ReadOptions chooses one.
  int Pages = 1;
  /// Smaller copies of the picture in the file, largest first.
  std::vector<Extent> Levels;
  /// What the reader had to change or leave out.
  std::vector<std::string> Notes;
  /// What the file is that was read.
  const FileType* Type = nullptr;
};

/// Reads an image file row by row. All failures are thrown as Failure, naming the file.
class ImageReader {
 public:
  virtual ~ImageReader() = default;
  const ImageInfo& Info() const { return About; }
  /// Before the first row: a type that can give the picture smaller for less work (JPEG by its transform, a
  /// file with smaller copies of itself) does so, as long as it stays at least this large; the proportions
  /// stay to within a pixel. Info() has the new size then. Other types change nothing.
  virtual void Reduce(std::int32_t /*leastWidth*/, std::int32_t /*leastHeight*/) {}
  /// From now on ReadRow gives the rows of this part, counted in pixels as they are stored; Info() has its
  /// size. False where the type reads only whole rows from the top; `PartOf` serves those too.
  virtual bool Select(const Rect& /*part*/) { return false; }
  /// Whether a part costs little more than its own pixels, wherever it lies. Select may then be called again
  /// and again, after any row.
  virtual bool StartsAnywhere() const { return false; }
  /// The next row, packed pixels of Info().Pixels. To be called Info().Height times.
  virtual void ReadRow(std::uint8_t* row) = 0;
  /// The next rows, `stride` bytes from one to the next.
  virtual void ReadRows(std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count);
  /// To be called after the last row: reads what stands behind the pixels, so that a file which is cut off
  /// there is noticed too.
  virtual void Finish() = 0;

 protected:
  friend std::unique_ptr<ImageReader> OpenImage(const Input& input, const ReadOptions& options);
  /// Tells the bits of a sample in the file, and what is lost of them.
  void SetBits(int bits);

  ImageInfo About;
};

/// Writes an image file row by row into an open file. Failures are thrown as Failure, naming the target.
class ImageWriter {
 public:
  virtual ~ImageWriter() = default;
  virtual void WriteRow(const std::uint8_t* row) = 0;
  /// The next rows, `stride` bytes from one to the next.
  virtual void WriteRows(const std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count);
  /// To be called after the last row: the file is complete then.
  virtual void Finish() = 0;
};

struct ReadOptions {
  /// Bytes that a file may need for itself beside one row (interlaced PNG, progressive JPEG, large tiles).
  std::int64_t MemoryLimit = 0;
  /// Threads that may decode beside the caller's; 0 stands for one a processor. The pixels don't depend on
  /// it.
  int Threads = 0;
  /// Where bytes go that come through a pipe, and belong to a type that doesn't read in order;
  /// DefaultTempDirectory where it is empty.
  std::filesystem::path TempDirectory = {};
  /// Which picture of a file with several, from 0 on.
  int Page = 0;
};

enum class Compression { Usual, None, LZW, Deflate, Zstd, JPEG, WebP };
/// All but Usual, by their names.
const std::map<std::string, Compression>& Compressions();

struct WriteOptions {
  /// 1 to 100, for JPEG and the types after it. From 90 on colours are kept at full resolution where a type
  /// has a choice.
  int Quality = 90;
  /// Every sample as it is, where a type has a way for that beside its usual one.
  bool Lossless = false;
  /// How TIFF packs its samples. Types with one way only refuse others than Usual.
  Compression Packing = Compression::Usual;
  /// The effort of packing, 0 to 9: of deflate, and of what other types have instead.
  std::optional<int> Level{};
  /// For TIFF: the edge of square tiles, a multiple of 16; 0 makes strips.
  std::int32_t Tile = 0;
  /// For TIFF: offsets of 64 bits however small the file is; smaller copies of the picture, each half as
  /// large as the one before, down to a tile.
  bool Big = false, Pyramid = false;
  /// Bytes that a type may hold which packs a picture as a whole.
  std::int64_t MemoryLimit = INT64_MAX;
  /// Threads that may encode, the caller's among them; 0 stands for one a processor. The bytes don't depend
  /// on it.
  int Threads = 0;
};

/// A type of image files: a row of the list in file_types.cpp, standing in the file of its reader and writer.
struct FileType {
  const char* Name;
  /// Endings of names, in small letters, the usual one first.
  std::vector<std::string_view> Extensions;
  /// The pixel formats that can be written, and the most pixels in each direction.
  std::vector<Format> Holds;
  std::int64_t MostEdge;
  /// Told by the first bytes of a file, as many of them as there are, 64 at most.
  bool (*Begins)(std::span<const std::uint8_t> start);
  /// Where those bytes aren't enough: whether the file is of this type. Null elsewhere.
  bool (*Is)(const Input& input) = nullptr;
  /// Whether files are read in order, from the first byte to the last, and written so; others get an input
  /// and an output in which they can move about.
  bool InOrder;
  /// Whether ReadOptions chooses one of several pictures of a file.
  bool Several = false;
  /// Whether parts are read without what is around them.
  bool Parts = false;
  std::unique_ptr<ImageReader> (*Open)(const Input& input, const ReadOptions& options);
  /// Starts a file at the beginning of `descriptor`, which stays the caller's. Of `info` the size, pixels,
  /// profile and density count, and of the notes those that the type has a place for; the orientation is
  /// written as upright. `target` names it in failures. Null where a type can only be read.
  std::unique_ptr<ImageWriter> (*Create)(int descriptor, const std::filesystem::path& target,
                                         const ImageInfo& info, const WriteOptions& options);
};

/// For `Open` and `Create`: classes that are made of what these get.
template <class Reader>
std::unique_ptr<ImageReader> OpenAs(const Input& input, const ReadOptions& options) {
  return std::make_unique<Reader>(input, options);
}
template <class Writer>
std::unique_ptr<ImageWriter> CreateAs(int descriptor, const std::filesystem::path& target,
                                      const ImageInfo& info, const WriteOptions& options) {
  return std::make_unique<Writer>(descriptor, target, info, options);
}

/// All types. What they begin with is tried in this order.
std::span<const FileType* const> FileTypes();

/// Opens an image of any of the types, told by its first bytes. One whose size can't hold the pixels that it
/// claims is refused before anything of their size is allocated.
std::unique_ptr<ImageReader> OpenImage(const Input& input, const ReadOptions& options);

/// Reads a part of a picture, which must lie within it. What lies below the part isn't looked at.
std::unique_ptr<ImageReader> PartOf(std::unique_ptr<ImageReader> reader, const Rect& part);

/// The type that the file's extension stands for. Throws UsageFailure.
const FileType& TypeByExtension(const std::filesystem::path& file);
/// The type of a name like "png", "JPEG" or "tif". Throws UsageFailure.
const FileType& TypeByName(const std::string& name);
/// The format nearest to `pixels` that a file of the type holds: JPEG has no alpha. Throws Failure where
/// there is none, as for CMYK in PNG, or where the type can't hold a picture of that size.
Format StorableFormat(const std::filesystem::path& file, const FileType& type, Format pixels);
void RequireStorableSize(const std::filesystem::path& file, const FileType& type, std::int64_t width,
                         std::int64_t height);

/// The channels of one of the six formats of files, alpha included, and whether alpha is among them.
int ChannelsOf(Format format);
bool HasAlpha(Format format);
Format WithoutAlpha(Format format);
Format WithAlpha(Format format);
/// "gray with alpha" and the like.
std::string Describe(Format format);

/// Whether the colour space that a profile names is that of the pixels.
bool ProfileFits(std::span<const std::uint8_t> profile, Format format);

/// For the codecs: refuses sizes beyond what a picture can have, and a size that needs more than
/// `fileSize` bytes at `pixelsPerByte`, the most that a byte of the file can stand for.
void RequirePlausible(const std::filesystem::path& file, std::int64_t width, std::int64_t height,
                      std::int64_t fileSize, double pixelsPerByte);
void RequireWithinLimit(const std::filesystem::path& file, std::int64_t bytes, std::int64_t memoryLimit,
                        const std::string& what);
/// Refuses a picture that isn't there.
void RequirePage(const Input& input, const ReadOptions& options, int pages);
/// Takes the alpha out of colours that have been multiplied by it, in a row of pixels with alpha.
void TakeAlphaOut(std::uint8_t* row, std::int64_t width, int channels);
bool StartsWith(std::span<const std::uint8_t> bytes, std::string_view magic);

}
