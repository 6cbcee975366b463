#pragma once
#include <memory>
#include <span>
#include <vector>

#include "object_model.h"
#include "picturezor/host_picture.h"
#include "quickdraw.h"

namespace picturezor::model {

/// What a picture of the host holds.
struct PicturePayload : Payload {
  PictureForm Form;
  quickdraw::GWorld World;
  /// The rows as their table has them, and the record that the table hangs on; a picture in rows has its last
  /// one first in memory, so that nobody gets by without the table.
  std::vector<std::uint8_t*> Rows;
  std::vector<std::uint8_t> Record;
  Object Mask;
  /// Since the picture was made.
  int CacheClears = 0;

  PicturePayload(std::int32_t width, std::int32_t height, PictureForm form);
  std::uint8_t* PixelAt(std::int32_t x, std::int32_t y) {
    return Rows[std::size_t(y)] + x * World.Map.PixelBytes;
  }
  Color Get(std::int32_t x, std::int32_t y) {
    return quickdraw::ReadPixel(PixelAt(x, y), World.Map.Depth, World.Map.PixelBytes);
  }
  void Set(std::int32_t x, std::int32_t y, Color color) {
    quickdraw::WritePixel(PixelAt(x, y), World.Map.Depth, World.Map.PixelBytes, color);
  }
};

/// A picture that draws are made on, kept alive.
struct GraphicsPayload : Payload {
  Object Target;
};

/// Where to, and what of the source.
struct Drawing {
  std::int32_t X, Y, Width, Height, SourceX, SourceY, SourceWidth, SourceHeight;
};
void Draw(PicturePayload& target, PicturePayload& source, const Drawing& drawing);

/// A new white picture with one reference. Null for a size that can't be.
void* NewPicture(std::int32_t width, std::int32_t height, PictureForm form);
/// The mask with one more reference, made where there is none if `create`.
void* MaskOf(PicturePayload& picture, bool create);

std::span<const Service> PictureServices();

}
