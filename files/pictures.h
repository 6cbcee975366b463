#pragma once
#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "image_file.h"
#include "picturezor/picture.h"
#include "progress.h"
#include "temporary_files.h"

namespace picturezor::files {

enum class Store { Auto, Memory, Mapped };

/// Where pictures live.
struct StoreOptions {
  Store Kind = Store::Auto;
  /// Bytes for all pictures of a command together; what doesn't fit goes to temporary files.
  std::int64_t MemoryLimit = 0;
  std::filesystem::path TempDirectory;
};

/// "256M", "1.5G" or a plain number of bytes. Throws UsageFailure.
std::int64_t ParseBytes(const std::string& text);
/// Half of the memory that is free.
std::int64_t DefaultMemoryLimit();

struct PictureSize {
  std::int32_t Width = 0, Height = 0;
  Format Of = Format::Unknown;

  /// Of its pixels, without a gap.
  std::int64_t RowBytes() const { return std::int64_t{Width} * BytesPerPixel(Of); }
};

/// Throws Failure where the disk under a directory has no room for a temporary file of so many bytes for
/// pixels of that size.
void RequireRoom(const std::filesystem::path& directory, std::int64_t bytes, const PictureSize& size);

/// The pictures that a command needs, zeroed. The smallest go to memory as long as the limit allows. A mapped
/// one has its room on the disk from the start and its file has no name any more, so nothing can be left
/// behind. Throws Failure where there is no room.
std::vector<Picture> MakePictures(const StoreOptions& options, const std::vector<PictureSize>& sizes);

/// One whose samples are anything at all: the caller fills all of them.
Picture MakeToFill(const StoreOptions& options, const PictureSize& size);

/// What an image file is once its orientation has been applied.
ImageInfo Upright(const ImageInfo& info);
/// The samples of a row of a picture that isn't a view. Throws Failure.
std::uint8_t* RowOf(const Picture& picture, std::int32_t y);
/// Where a part of the upright image is stored.
Rect Stored(const Rect& upright, const ImageInfo& info);
/// Reads all rows into a picture of the upright size and the file's format.
void ReadInto(const Picture& picture, ImageReader& reader, Progress& progress);
bool HasColours(const Picture& picture);
/// The format of files that has a picture's colours and alpha. Throws Failure for one without colours.
Format FileFormatOf(const Picture& picture);
/// Whether there is a way from a picture's format to a file's.
bool Convertible(Format from, Format to);
/// Fills a picture of a format of files with the rows of another one from `first` on. A missing alpha becomes
/// opaque. Gray becomes black ink alone, and gray comes of black ink alone.
void CopyInFileFormat(const Picture& from, std::int32_t first, const Picture& into);
/// Writes all rows in a format of files.
void WriteFrom(const Picture& picture, ImageWriter& writer, Format format, Progress& progress);

}
