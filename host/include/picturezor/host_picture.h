#pragma once
#include "picturezor/host.h"
#include "picturezor/object.h"

namespace picturezor {

/// A colour; black at first.
struct Color {
  ///@{
  /// 0 to 255.
  std::uint8_t Red = 0, Green = 0, Blue = 0;
  ///@}
  /// 0xRRGGBB.
  std::int32_t Packed() const { return Red << 16 | Green << 8 | Blue; }
  /// Whether all three are equal.
  bool operator==(const Color&) const = default;
};

/// A picture of the host: red, green and blue, 1 to 32767 pixels on a side, and maybe a mask, which is
/// another picture of the same size. Copies refer to the same picture. Calling a member on nil throws
/// ModuleError.
class HostPicture : public Object {
 public:
  /// Nil.
  HostPicture() = default;
  /// The picture that an object of the host is; nothing is checked.
  explicit HostPicture(Object object) : Object(std::move(object)) {}
  ///@{
  /// A white picture in the form of this host's pictures, or in one of its own. Throws std::invalid_argument
  /// for a side that isn't 1 to 32767.
  HostPicture(std::int32_t width, std::int32_t height);
  HostPicture(std::int32_t width, std::int32_t height, PictureForm form);
  ///@}

  /// Columns.
  std::int32_t Width() const;
  /// Rows.
  std::int32_t Height() const;
  /// How its pixels are held.
  PictureForm Form() const;

  ///@{
  /// Throws std::out_of_range outside the picture. In a GWorld of 16 bits a colour keeps its upper 5 bits.
  Color Pixel(std::int32_t x, std::int32_t y) const;
  void SetPixel(std::int32_t x, std::int32_t y, Color color) const;
  ///@}
  ///@{
  /// All pixels, row by row, as red, green and blue: 3 x `Width` x `Height` bytes. Throws
  /// std::invalid_argument for another number of them.
  Bytes RGB() const;
  void SetRGB(std::span<const std::uint8_t> bytes) const;
  ///@}

  /// The mask; nil where there is none.
  HostPicture Mask() const;
  /// The mask, made white where there was none. Throws std::bad_alloc.
  HostPicture MakeMask() const;
  /// Draws a block of a picture, `sourceWidth` x `sourceHeight` at `sourceX`, `sourceY`, into `width` x
  /// `height` at x, y, by the nearest pixel. Masks play no part; what lies outside of either is left out, and
  /// a size below 1 draws nothing.
  void Draw(const HostPicture& source, std::int32_t x, std::int32_t y, std::int32_t width,
            std::int32_t height, std::int32_t sourceX, std::int32_t sourceY, std::int32_t sourceWidth,
            std::int32_t sourceHeight) const;
};

/// Pixels in QuickDraw's way, as `CopyGWorld` makes them. Calling a member on nil throws ModuleError.
class GWorld : public Object {
 public:
  /// Nil.
  GWorld() = default;
  /// The GWorld that an object of the host holds.
  explicit GWorld(Object object) : Object(std::move(object)) {}

  /// Columns.
  std::int32_t Width() const;
  /// Rows.
  std::int32_t Height() const;
  /// Bits of a pixel: 8 gray; 24 red, green, blue, behind a byte 255 where a pixel takes 4 bytes; 32 alpha,
  /// red, green, blue.
  std::int32_t Depth() const;
  /// Bytes of a pixel, 1 to 4.
  std::int32_t PixelBytes() const;
  /// A row's pixels, `Width` x `PixelBytes` bytes. Throws std::out_of_range outside the GWorld.
  Bytes Row(std::int32_t y) const;
};

}
