#pragma once
#include "image/picture_data.h"

namespace zor {

/// A plane's fields in the record.
struct PlaneFields {
  bool PictureData::*Has;
  std::int32_t PictureData::*Offset;
};

inline constexpr PlaneFields RedPlane{&PictureData::HasRed, &PictureData::RedOffset},
    GreenPlane{&PictureData::HasGreen, &PictureData::GreenOffset},
    BluePlane{&PictureData::HasBlue, &PictureData::BlueOffset},
    GrayPlane{&PictureData::HasGray, &PictureData::GrayOffset},
    AlphaPlane{&PictureData::HasAlpha, &PictureData::AlphaOffset},
    CyanPlane{&PictureData::HasCyan, &PictureData::CyanOffset},
    MagentaPlane{&PictureData::HasMagenta, &PictureData::MagentaOffset},
    YellowPlane{&PictureData::HasYellow, &PictureData::YellowOffset},
    BlackPlane{&PictureData::HasBlack, &PictureData::BlackOffset};

}
