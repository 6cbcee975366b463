#pragma once
#include <cstdint>
#include <iterator>

#include "frame/records.h"
#include "image/picture_data.h"

namespace zor {

/// The codes that operations name themselves; the table in formats.cpp has all 39.
enum FormatCode : std::int32_t {
  FormatRGB = 1,
  FormatARGB = 4,
  FormatXRGB = 5,
  FormatBGR = 6,
  FormatXBGR = 10,
  FormatG = 11,
  FormatCMYK = 23,
  FormatXCMYK = 27,
  FormatKYMC = 28,
  FormatXKYMC = 32,
  FormatScaling1 = 33,
  FormatScaling2 = 34,
  FormatScaling4 = 36,
  FormatScaling5 = 37,
};

/// Writes size and format into the record and lays its planes out. False, and nothing written, when a size is
/// below 1; false, with size and code stored and an all-zero layout, when the code has no layout. Touches
/// neither the store nor `Valid`.
bool InitImageLayout(PictureData* data, std::int32_t width, std::int32_t height, std::uint32_t format);

/// Bytes of a row of `Width` packed pixels; 64-bit, since the product may pass 32.
inline std::int64_t PackedRowBytes(const PictureData& picture) {
  return std::int64_t{picture.Width} * picture.PixelSize;
}

/// Bytes of a stored row to the end of its last pixel, and `RowSize` at least. In a caller's block the pixels
/// may reach further than the way from row to row.
inline std::int64_t StoredRowBytes(const PictureData& picture) {
  const std::int64_t extent = picture.LeftEdge + PackedRowBytes(picture);
  return extent > picture.RowSize ? extent : picture.RowSize;
}

/// The name of a format for people; null for the single planes, the plain buffer and unknown codes.
const char* FormatName(std::uint32_t format);

/// The constants of the formats with their aliases, in the order of the class.
// clang-format off
inline constexpr ConstantRecord FormatConstants[] = {
    {"ImageFormatUnknown", 0, 0},
    {"ImageFormatRGB", 0, 1}, {"ImageFormatRGBA", 0, 2}, {"ImageFormatRGBX", 0, 3},
    {"ImageFormatARGB", 0, 4}, {"ImageFormatXRGB", 0, 5},
    {"ImageFormatBGR", 0, 6}, {"ImageFormatBGRA", 0, 7}, {"ImageFormatBGRX", 0, 8},
    {"ImageFormatABGR", 0, 9}, {"ImageFormatXBGR", 0, 10},
    {"ImageFormatG", 0, 11}, {"ImageFormatGA", 0, 12}, {"ImageFormatAG", 0, 13},
    {"ImageFormatScaling1", 0, 33}, {"ImageFormatScaling2", 0, 34}, {"ImageFormatScaling3", 0, 35},
    {"ImageFormatScaling4", 0, 36}, {"ImageFormatScaling5", 0, 37}, {"ImageFormatScaling6", 0, 38},
    {"ImageFormatScaling7", 0, 39}, {"ImageFormatScaling8", 0, 40},
    {"ImageFormatBuffer", 0, 22},
    {"ImageFormat1of3", 0, 15}, {"ImageFormat2of3", 0, 16}, {"ImageFormat3of3", 0, 17},
    {"ImageFormat1of4", 0, 18}, {"ImageFormat2of4", 0, 19}, {"ImageFormat3of4", 0, 20},
    {"ImageFormat4of4", 0, 21},
    {"ImageFormatRofRGB", 0, 15}, {"ImageFormatGofRGB", 0, 16}, {"ImageFormatBofRGB", 0, 17},
    {"ImageFormatRofRGBA", 0, 18}, {"ImageFormatGofRGBA", 0, 19}, {"ImageFormatBofRGBA", 0, 20},
    {"ImageFormatAofRGBA", 0, 21},
    {"ImageFormatRofARGB", 0, 19}, {"ImageFormatGofARGB", 0, 20}, {"ImageFormatBofARGB", 0, 21},
    {"ImageFormatAofARGB", 0, 18},
    {"ImageFormatRofBGR", 0, 17}, {"ImageFormatGofBGR", 0, 16}, {"ImageFormatBofBGR", 0, 15},
    {"ImageFormatRofBGRA", 0, 20}, {"ImageFormatGofBGRA", 0, 19}, {"ImageFormatBofBGRA", 0, 18},
    {"ImageFormatAofBGRA", 0, 21},
    {"ImageFormatRofABGR", 0, 21}, {"ImageFormatGofABGR", 0, 20}, {"ImageFormatBofABGR", 0, 19},
    {"ImageFormatAofABGR", 0, 18},
    {"ImageFormatCMYK", 0, 23}, {"ImageFormatCMYKA", 0, 24}, {"ImageFormatACMYK", 0, 25},
    {"ImageFormatCMYKX", 0, 26}, {"ImageFormatXCMYK", 0, 27},
    {"ImageFormatKYMC", 0, 28}, {"ImageFormatKYMCA", 0, 29}, {"ImageFormatAKYMC", 0, 30},
    {"ImageFormatKYMCX", 0, 31}, {"ImageFormatXKYMC", 0, 32},
};
// clang-format on
static_assert(std::size(FormatConstants) == 62);

}
