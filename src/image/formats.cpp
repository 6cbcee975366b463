#include "image/formats.h"

#include <cstring>

#include "image/plane_fields.h"

namespace zor {
namespace {

struct Format {
  const char* Name;
  /// A letter a byte of the pixel: R G B C M Y K, g for gray, A for alpha, and - for a byte of no plane.
  const char* Pixel;
};

// By code. RGBA's name has been spelt so from the beginning, and programs compare with it.
// clang-format off
constexpr Format Formats[] = {
    {nullptr, ""},
    {"RGB", "RGB"}, {"RBBA", "RGBA"}, {"RGBX", "RGB-"}, {"ARGB", "ARGB"}, {"XRGB", "-RGB"},
    {"BGR", "BGR"}, {"BGRA", "BGRA"}, {"BGRX", "BGR-"}, {"ABGR", "ABGR"}, {"XBGR", "-BGR"},
    {"G", "g"}, {"GA", "gA"}, {"AG", "Ag"},
    {nullptr, ""},
    {nullptr, "g--"}, {nullptr, "-g-"}, {nullptr, "--g"},
    {nullptr, "g---"}, {nullptr, "-g--"}, {nullptr, "--g-"}, {nullptr, "---g"},
    {nullptr, "-"},
    {"CMYK", "CMYK"}, {"CMYKA", "CMYKA"}, {"ACMYK", "ACMYK"}, {"CMYKX", "CMYK-"}, {"XCMYK", "-CMYK"},
    {"KYMC", "KYMC"}, {"KYMCA", "KYMCA"}, {"AKYMC", "AKYMC"}, {"KYMCX", "KYMC-"}, {"XKYMC", "-KYMC"},
    {"Scaling", "-"}, {"Scaling", "--"}, {"Scaling", "---"}, {"Scaling", "----"},
    {"Scaling", "-----"}, {"Scaling", "------"}, {"Scaling", "-------"}, {"Scaling", "--------"},
};
// clang-format on
static_assert(std::size(Formats) == 41);

/// What a letter of a pixel sets in the record.
struct Plane {
  char Letter;
  PlaneFields Of;
  bool PictureData::*Family;
};

constexpr Plane AllPlanes[] = {
    {'R', RedPlane, &PictureData::IsRGB},
    {'G', GreenPlane, &PictureData::IsRGB},
    {'B', BluePlane, &PictureData::IsRGB},
    {'g', GrayPlane, &PictureData::IsGray},
    {'A', AlphaPlane, nullptr},
    {'C', CyanPlane, &PictureData::IsCMYK},
    {'M', MagentaPlane, &PictureData::IsCMYK},
    {'Y', YellowPlane, &PictureData::IsCMYK},
    {'K', BlackPlane, &PictureData::IsCMYK},
};

void ClearLayout(PictureData& data) {
  data.ChannelOffsets = {};
  data.ChannelCount = data.PixelSize = data.RowSize = 0;
  data.IsRGB = data.IsGray = data.IsCMYK = false;
  for (const Plane& plane : AllPlanes) {
    data.*plane.Of.Offset = 0;
    data.*plane.Of.Has = false;
  }
}

}

bool InitImageLayout(PictureData* data, std::int32_t width, std::int32_t height, std::uint32_t format) {
  if (!data || width <= 0 || height <= 0) return false;
  data->Width = width;
  data->Height = height;
  data->ImageFormat = std::int32_t(format);
  ClearLayout(*data);
  if (format >= std::size(Formats) || !*Formats[format].Pixel) return false;
  const char* pixel = Formats[format].Pixel;
  data->PixelSize = std::int32_t(std::strlen(pixel));
  for (std::int32_t offset = 0; offset < data->PixelSize; ++offset)
    for (const Plane& plane : AllPlanes) {
      if (plane.Letter != pixel[offset]) continue;
      data->*plane.Of.Offset = offset;
      data->*plane.Of.Has = true;
      if (plane.Family) data->*plane.Family = true;
      data->ChannelOffsets[std::size_t(data->ChannelCount++)] = offset;
    }
  return true;
}

const char* FormatName(std::uint32_t format) {
  if (format == 0) return "Unknown";
  return format < std::size(Formats) ? Formats[format].Name : nullptr;
}

}
