#pragma once
#include <atomic>

#include "image/clip.h"
#include "image/picture_data.h"

namespace zor {

// A picture promises no address range but a function, `RowGetter`, which gives the address of one row at a
// time. Behind it stands a store: memory of our own, memory of a host object, or a file of which only a
// window of rows is mapped, and the window follows the rows that are asked for.
//
// A store is shared by the picture that made it and all views on it, and ends with the last of them. So
// closing a picture never takes the samples from under a view. A picture is used by one host thread at a
// time; pictures of one store, each with a window of its own, may be used by several.
struct Store {
  std::atomic<std::int32_t> Pictures = 1;
  /// `calloc`ed samples, or null.
  Sample* Memory = nullptr;
  /// The host object that the samples belong to, with a reference; or null.
  void* Keeper = nullptr;
  /// The mapped file with its `calloc`ed path, or a null path.
  char* Path = nullptr;
  int FileDescriptor = -1;
  Store* NextOnFile = nullptr;
};

/// Bytes of a page as the stores count them: the system's, but at least 4096.
extern std::int32_t PageSize;
void InitPageSize();

/// The bytes of a row of `Width` pixels rounded up to a multiple of `unit`; 0 when they pass 32 bits.
std::int32_t RoundedRowSize(const PictureData& data, std::int32_t unit);

/// Puts the picture on zeroed memory of its own, with `RowSize` and `TotalSize` as they stand in the record.
/// False without memory, or for 2 GiB and more.
bool UseOwnMemory(PictureData& data);

/// Puts the picture on the memory of a host object, which the store keeps alive. False without memory for
/// the store itself, or with a null base.
bool UseHostMemory(PictureData& data, void* base, void* keeper);

/// Puts the picture on a new file, whose `calloc`ed path it takes over, and maps the first window, of about
/// `blockSize` bytes. An existing file is overwritten, but for one that a picture of this process is using,
/// and for what isn't a plain file: these are refused and stay. False when the file can't be made at its full
/// size: then it is removed. When only the window fails, the file stays until `LeaveStore`.
bool UseMappedFile(PictureData& data, char* path, std::int32_t blockSize);

/// Puts a view, whose size, layout and `RowGetter` stand, on its parent's store. On a mapped store it gets a
/// window of its own, at its row 0.
void ShareStore(PictureData& view, const PictureData& parent);

/// Takes the picture off its store, which ends if it was the last one there: memory is freed, a file is cut
/// to nothing and removed.
void LeaveStore(PictureData& data);

/// Sets `MappingBlockSize` and `RowsPerBlock` for the bytes asked for: whole pages, at least five rows, no
/// more than the file if five rows fit in it.
void ComputeBlockSize(PictureData& data, std::int32_t requested);

/// The setter of `MappingBlockSize`. On a mapped store the window moves to the top, so row addresses taken
/// before are void. A picture without a `RowGetter` ignores it.
void SetMappingBlockSize(PictureZOR* self, Word, Integer value);

/// The getter that shows the same store upside down; null stays null.
PictureData::RowFunction Mirrored(PictureData::RowFunction getter);

/// Whether the rows of a picture stand in its store from the bottom up.
bool IsMirrored(const PictureData& picture);

/// How many rows from any one on can be in the address space together.
std::int32_t MostRowsTogether(const PictureData& data);

/// The address of row `first` with all rows to `last` in the address space, on a mapped store until the next
/// row is asked for. Null where they can't be, and on a closed picture.
Sample* RowsTogether(PictureData& data, std::int32_t first, std::int32_t last);

/// Copies a rectangle of a mapped picture into memory, `stride` bytes from row to row, or from there, without
/// mapping it: for less than the page faults take where each of its pages is used once. What is mapped of the
/// same file shows it. False when the file gives or takes less.
bool ReadPixels(const PictureData& picture, const Rectangle& pixels, Sample* into, std::ptrdiff_t stride);
bool WritePixels(const PictureData& picture, const Rectangle& pixels, const Sample* from,
                 std::ptrdiff_t stride);

/// Whether a byte from the first to the last pixel of a row of one picture is one of such a row of the other,
/// so that a write to one can show in the other.
bool SharePixels(const PictureData& a, const PictureData& b);

/// The row of the store that a picture shows as row y; a mirrored one counts from its last row.
std::int64_t StoreRowOf(const PictureData& picture, std::int32_t y);

/// Whether the rows of a picture end before the next one begins. In a caller's block they needn't.
bool RowsAreApart(const PictureData& picture);

/// A place in a picture: a column and a row.
struct Place {
  std::int32_t X, Y;
};

/// How many pixels from a place on may be read before the first pixel from the other place on is written, so
/// that what is read is the same as when each pixel is read just before its turn to be written. Within a row;
/// 1 where nothing better can be told.
std::int32_t ReadAhead(const PictureData& read, Place from, const PictureData& written, Place into);

}
