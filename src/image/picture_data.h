#pragma once
#include <array>
#include <cstddef>
#include <cstdint>

#include "frame/types.h"

namespace zor {

/// One byte, in every format.
using Sample = std::uint8_t;

/// What becomes of each sample value.
using SampleTable = std::array<Sample, 256>;

struct Store;
struct FileRegions;

/// The instance data of a PictureZOR. The host allocates it zero-filled; a constructor fills it, and after
/// that its size, format and layout never change.
///
/// Sample P of pixel x in a row is the byte at row + x * PixelSize + POffset. On a clip view the offsets hold
/// `LeftEdge` too.
struct PictureData {
  using RowFunction = Sample* (*)(PictureData*, std::int32_t row);

  /// Least ticks between two yields; 0 or less is never. A tick is 1/60 second.
  std::int32_t YieldTicks, LastYieldTick;
  PictureFactoryZOR* Factory;
  MemoryBlock* MemoryTarget;
  Boolean DebugPictureEnabled;
  std::int32_t RedOffset;
  bool HasRed;
  std::int32_t GreenOffset;
  bool HasGreen;
  std::int32_t BlueOffset;
  bool HasBlue;
  std::int32_t GrayOffset;
  bool HasGray;
  std::int32_t AlphaOffset;
  bool HasAlpha;
  std::int32_t CyanOffset;
  bool HasCyan;
  std::int32_t MagentaOffset;
  bool HasMagenta;
  std::int32_t YellowOffset;
  bool HasYellow;
  std::int32_t BlackOffset;
  bool HasBlack;
  /// Pixels per row; 0 or less only on a clip view.
  std::int32_t Width;
  bool IsGray;
  std::int32_t Height;
  bool IsRGB;
  /// Bytes from one row to the next.
  std::int32_t RowSize;
  bool IsCMYK;
  std::int32_t PixelSize;
  bool Valid;
  std::int32_t ImageFormat;
  /// Added to a row's index before the store is addressed.
  std::int32_t RowOffset;
  /// Bytes of the store as built; a view carries its parent's.
  std::int64_t TotalSize;
  /// The planes without the filler bytes, in the order of their offsets.
  std::int32_t ChannelCount;
  std::array<std::int32_t, 8> ChannelOffsets;
  /// The picture that a view was made from.
  PictureZOR* Parent;
  FolderItem* FileItem;
  /// The host picture whose pixels these are.
  HostPicture* Target;
  /// What holds the samples, shared with the views; null when there is none.
  Store* Samples;
  /// The first row of the store, or of the window on a mapped store.
  Sample* PixelBase;
  bool WindowMapped, IsMapping;
  /// What is mapped of a file; null when nothing was.
  FileRegions* Regions;
  /// Bytes of a window.
  std::int32_t MappingBlockSize;
  RowFunction RowGetter;
  /// The store rows that the window covers, -1 without one.
  std::int32_t WindowFirstRow, WindowLastRow;
  /// Rows of a window.
  std::int32_t RowsPerBlock;
  /// Bytes of a row before the first pixel that a clip view, or a view of one, shows.
  std::int32_t LeftEdge;
};

/// The host allocates 256 bytes of instance data where the record fits, as it does with 32-bit words.
static_assert(sizeof(void*) > 4 || sizeof(PictureData) <= 256);
inline constexpr std::size_t PictureDataSize =
    sizeof(PictureData) <= 256 ? 256 : (sizeof(PictureData) + 15) / 16 * 16;

/// The record of a picture.
PictureData& DataOf(PictureZOR* picture);

/// Whether a picture's rows can be asked for. False on an empty or closed picture, on a mapped one that has
/// lost its window, and on a view with no rows.
inline bool Usable(const PictureData& picture) {
  return picture.RowGetter && picture.Valid && picture.PixelBase && picture.Width >= 0 && picture.Height >= 1;
}

/// Lets the host's other threads run if `YieldTicks` have passed since the last time.
void YieldCheck(PictureData& picture);
inline void MayYield(PictureData& picture) {
  if (picture.YieldTicks > 0) YieldCheck(picture);
}

}
