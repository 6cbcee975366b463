#pragma once
#include "frame/host_values.h"
#include "frame/method.h"
#include "image/stores.h"

namespace zor {

// Constructors raise nothing: a picture that can't be made stays not `Valid`. On a picture that was built
// before a constructor does nothing.

/// A picture of zeroed samples in memory of its own, below 2 GiB; rows start 64 bytes apart or a multiple.
void Constructor(PictureZOR* self, Integer width, Integer height, Integer format);
/// A picture over the caller's memory, which it keeps alive. The caller vouches that `height` rows of
/// `rowSize` bytes lie in the block; a negative `rowSize`, which would start before it, is refused.
void Constructor(PictureZOR* self, MemoryBlock* buf, Integer width, Integer height, Integer format,
                 Integer rowSize);
/// A picture in a temporary file, which is created or overwritten, takes up its full size on the disk from
/// the start, and is removed when the last picture using it has been closed. About `blockSize` bytes of it
/// are mapped at a time, as ComputeBlockSize says. A picture of fewer than 5 rows isn't `Valid`, nor one on a
/// file that another picture of the process is using, or on what isn't a plain file.
void Constructor(PictureZOR* self, Integer width, Integer height, Integer format, Integer blockSize,
                 FolderItem* filePath);
/// Ends the picture; also the destructor. Its store lives on while a view uses it. More than once is
/// harmless.
void Close(PictureZOR* self);
/// A copy in memory of its own, with the rows that this picture shows, each as long as its `RowSize`; nil for
/// a mapped picture, one that isn't usable, or without memory.
PictureZOR* Clone(PictureZOR* self);
/// A new picture through this picture's factory, the global one, or plain memory.
PictureZOR* CreatePictureZOR(PictureZOR* self, Integer width, Integer height, Integer format);
/// A new picture through the global factory, or in plain memory.
PictureZOR* CreatePictureZOR(Integer width, Integer height, Integer format);
/// Bytes that a picture in memory takes; 0 for a size or format that is refused.
Int64 CalculateMemory(Integer width, Integer height, Integer format);
/// Whether these bytes and a MiB more can be had now; false from 4 GiB on.
Boolean CanAllocateImage(Integer width, Integer height, Integer format);
/// Keeps the factory that all new pictures of the process are asked from; nil for none.
void SetFactory(PictureFactoryZOR* factory);

// Rows and whole pictures as bytes. A row's index outside the picture and a nil value raise; a picture that
// isn't usable, a format without a layout or a family, and bytes beyond 2 GiB give nil or do nothing.
// Converted bytes are packed. Red, green and blue become gray by (77 r + 151 g + 28 b) / 256, gray becomes
// all three or all four inks, black becomes gray; RGB and CMYK have no way to each other, which raises. Alpha
// is copied where both sides have it. Bytes that nothing is said about are 0 in what is given, and keep their
// values in the picture.

/// A block over the stored row itself, its filler and padding included; on a mapped store good until the
/// window moves.
MemoryBlock* RawRow(PictureZOR* self, Integer index);
/// A copy of the `RowSize` bytes of the stored row.
MemoryBlock* Row(PictureZOR* self, Integer index);
void SetRow(PictureZOR* self, Integer index, MemoryBlock* value);
MemoryBlock* RowInFormat(PictureZOR* self, Integer index, Integer format);
void SetRowInFormat(PictureZOR* self, Integer index, Integer format, MemoryBlock* value);
/// With `invertAlpha` each alpha that is copied becomes 255 - alpha.
MemoryBlock* RowInFormat(PictureZOR* self, Integer index, Integer format, Boolean invertAlpha);
void SetRowInFormat(PictureZOR* self, Integer index, Integer format, Boolean invertAlpha, MemoryBlock* value);
HostString* RowStringInFormat(PictureZOR* self, Integer index, Integer format);
void SetRowStringInFormat(PictureZOR* self, Integer index, Integer format, HostString* value);
/// All rows one after the other. Nil when one of them can't be reached.
HostString* DataStringInFormat(PictureZOR* self, Integer format);
/// Stops at a row that can't be reached; the rows above it are set.
void SetDataStringInFormat(PictureZOR* self, Integer format, HostString* value);

// Views: pictures without samples of their own, which show and write those of another. They live on the
// other's store and keep it alive, so an explicit `Close` of the parent takes nothing away from them. None of
// them tests `Valid`: a view of a picture that isn't valid isn't valid either.

/// A gray picture of one plane; nil where the picture doesn't have it.
PictureZOR* AlphaChannel(PictureZOR* self);
PictureZOR* RedChannel(PictureZOR* self);
PictureZOR* GreenChannel(PictureZOR* self);
PictureZOR* BlueChannel(PictureZOR* self);
PictureZOR* GrayChannel(PictureZOR* self);
PictureZOR* CyanChannel(PictureZOR* self);
PictureZOR* MagentaChannel(PictureZOR* self);
PictureZOR* YellowChannel(PictureZOR* self);
PictureZOR* BlackChannel(PictureZOR* self);
/// The plane by its place in the pixel, fillers not counted; an index outside raises.
PictureZOR* Channel(PictureZOR* self, Integer index);
/// The colours without alpha, with the `Has` flags of their planes; nil for another family.
PictureZOR* RGBChannels(PictureZOR* self);
PictureZOR* CMYKChannels(PictureZOR* self);
/// The part of the picture that lies in the rectangle; a negative size means to the left or upwards. Outside
/// of the picture its `Width` or `Height` is 0 or less, and nothing can be done with it. Of a mirrored view,
/// the rows are counted from the top of what it mirrors and then shown in reverse order.
PictureZOR* ClipImage(PictureZOR* self, Integer x, Integer y, Integer width, Integer height);
/// The whole picture.
PictureZOR* ClipImage(PictureZOR* self);
/// The picture with its rows in reverse order.
PictureZOR* MirroredView(PictureZOR* self);

// Properties; the word is the host's and means nothing here.

/// A block over the start of the store, or over the window of a mapped one; nil without either.
MemoryBlock* Memory(PictureZOR* self, Word);
Int64 TotalSize(PictureZOR* self, Word);
/// Nil for a format without a name.
HostString* ImageFormatString(PictureZOR* self, Word);

// clang-format off
inline constexpr MethodRow ImageMethods[] = {
    Method<11, "CreatePictureZOR(width as integer, height as integer, ImageFormat as integer) as PictureZOR", CreatePictureZOR>,
    Method<15, "Constructor(width as integer, height as integer, ImageFormat as integer, BlockSize as integer, FilePath as folderitem)", Constructor>,
    Method<16, "Constructor(width as integer, height as integer, ImageFormat as integer)", Constructor>,
    Method<18, "Constructor(Buf as MemoryBlock, width as integer, height as integer, ImageFormat as integer, RowSize as integer)", Constructor>,
    Method<39, "AlphaChannel as PictureZOR", AlphaChannel>,
    Method<40, "RedChannel as PictureZOR", RedChannel>,
    Method<41, "GreenChannel as PictureZOR", GreenChannel>,
    Method<42, "BlueChannel as PictureZOR", BlueChannel>,
    Method<43, "GrayChannel as PictureZOR", GrayChannel>,
    Method<44, "RGBChannels as PictureZOR", RGBChannels>,
    Method<45, "CMYKChannels as PictureZOR", CMYKChannels>,
    Method<46, "CyanChannel as PictureZOR", CyanChannel>,
    Method<47, "MagentaChannel as PictureZOR", MagentaChannel>,
    Method<48, "YellowChannel as PictureZOR", YellowChannel>,
    Method<49, "BlackChannel as PictureZOR", BlackChannel>,
    Method<50, "Channel(index as integer) as PictureZOR", Channel>,
    Method<51, "MirroredView as PictureZOR", MirroredView>,
    Method<52, "Close", Close>,
    Method<66, "RawRow(index as integer) as memoryblock", RawRow>,
    Method<67, "Row(index as integer) as memoryblock", Row, PlainFlags, SetRow>,
    Method<68, "RowInFormat(index as integer, ImageFormat as integer) as memoryblock", RowInFormat, PlainFlags, SetRowInFormat>,
    Method<69, "RowInFormat(index as integer, ImageFormat as integer, InvertAlpha as boolean) as memoryblock", RowInFormat, PlainFlags, SetRowInFormat>,
    Method<70, "RowStringInFormat(index as integer, ImageFormat as integer) as string", RowStringInFormat, PlainFlags, SetRowStringInFormat>,
    Method<71, "DataStringInFormat(ImageFormat as integer) as string", DataStringInFormat, PlainFlags, SetDataStringInFormat>,
    Method<72, "Clone as PictureZOR", Clone>,
    Method<109, "ClipImage as PictureZOR", ClipImage>,
    Method<110, "ClipImage(x as integer, y as integer, width as integer, height as integer) as PictureZOR", ClipImage>,
};

inline constexpr MethodRow SharedPictureMethods[] = {
    SharedMethod<1, "CreatePictureZOR(width as integer, height as integer, theImageFormat as integer) as PictureZOR", CreatePictureZOR>,
    SharedMethod<2, "CalculateMemory(width as integer, height as integer, theImageFormat as integer) as Int64", CalculateMemory>,
    SharedMethod<3, "CanAllocateImage(width as integer, height as integer, theImageFormat as integer) as boolean", CanAllocateImage>,
};

inline constexpr MethodRow SharedFactoryMethods[] = {
    SharedMethod<1, "SetFactory(factory as PictureFactoryZOR)", SetFactory>,
};
// clang-format on

}
