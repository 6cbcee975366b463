#pragma once
#include "image/picture_data.h"

namespace zor {

/// A rectangle of pixels. In a picture's bounds once it has been clipped.
struct Rectangle {
  std::int32_t X, Y, Width, Height;
  bool Empty() const { return Width < 1 || Height < 1; }
};

/// The part of a rectangle that lies in the picture; empty when there is none. A negative width or height
/// means to the left or upwards.
Rectangle FilterRect(const PictureData& picture, Rectangle rectangle);

/// A block that goes from one picture into another: where it lands, and where it comes from.
struct CopyBlock {
  Rectangle Dest;
  std::int32_t SourceX, SourceY;
};

/// The part of a block that lies in both pictures; its rectangle is empty when there is none. A negative
/// source origin moves the destination's origin left or up by as much and shortens the block; then a
/// negative width or height means to the left or upwards of the destination's origin.
CopyBlock CopyRect(const PictureData& dest, const PictureData& source, CopyBlock block);
CopyBlock CopyRect(const PictureData& dest, std::int32_t sourceWidth, std::int32_t sourceHeight,
                   CopyBlock block);

}
