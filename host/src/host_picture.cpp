#include "picturezor/host_picture.h"

#include <new>

#include "pictures.h"

namespace picturezor {

using namespace model;

namespace {

PicturePayload& Held(const HostPicture& picture) {
  if (auto* payload = HeldBy<PicturePayload>(picture.Address())) return *payload;
  throw ModuleError("a host picture that is nil was used");
}

PicturePayload& HeldAt(const HostPicture& picture, std::int32_t x, std::int32_t y) {
  PicturePayload& payload = Held(picture);
  const quickdraw::PixMap& map = payload.World.Map;
  if (x < 0 || x >= map.Width || y < 0 || y >= map.Height)
    throw std::out_of_range("a pixel outside the host picture");
  return payload;
}

Object Made(std::int32_t width, std::int32_t height, PictureForm form) {
  void* made = NewPicture(width, height, form);
  if (!made) throw std::invalid_argument("a host picture is 1 to 32767 pixels on a side");
  return Object::Adopt(made);
}

quickdraw::GWorld& GWorldOf(const GWorld& gworld) {
  auto* held = gworld ? quickdraw::OfInstance(gworld.Address()) : nullptr;
  if (!held) throw ModuleError("a GWorld that is nil was used");
  return *held;
}

}

HostPicture::HostPicture(std::int32_t width, std::int32_t height)
    : HostPicture(width, height, TheRuntime().Pictures) {}
HostPicture::HostPicture(std::int32_t width, std::int32_t height, PictureForm form)
    : Object(Made(width, height, form)) {}

std::int32_t HostPicture::Width() const { return Held(*this).World.Map.Width; }
std::int32_t HostPicture::Height() const { return Held(*this).World.Map.Height; }
PictureForm HostPicture::Form() const { return Held(*this).Form; }

Color HostPicture::Pixel(std::int32_t x, std::int32_t y) const { return HeldAt(*this, x, y).Get(x, y); }
void HostPicture::SetPixel(std::int32_t x, std::int32_t y, Color color) const {
  HeldAt(*this, x, y).Set(x, y, color);
}

Bytes HostPicture::RGB() const {
  PicturePayload& held = Held(*this);
  Bytes bytes(std::size_t(Width()) * std::size_t(Height()) * 3);
  std::uint8_t* at = bytes.data();
  for (std::int32_t y = 0; y < Height(); ++y)
    for (std::int32_t x = 0; x < Width(); ++x) {
      const Color color = held.Get(x, y);
      *at++ = color.Red;
      *at++ = color.Green;
      *at++ = color.Blue;
    }
  return bytes;
}

void HostPicture::SetRGB(std::span<const std::uint8_t> bytes) const {
  PicturePayload& held = Held(*this);
  const std::size_t needed = std::size_t(Width()) * std::size_t(Height()) * 3;
  if (bytes.size() != needed)
    throw std::invalid_argument(std::to_string(needed) + " bytes needed, " + std::to_string(bytes.size()) +
                                " given");
  const std::uint8_t* at = bytes.data();
  for (std::int32_t y = 0; y < Height(); ++y)
    for (std::int32_t x = 0; x < Width(); ++x, at += 3) held.Set(x, y, {at[0], at[1], at[2]});
}

HostPicture HostPicture::Mask() const { return HostPicture(Object::Adopt(MaskOf(Held(*this), false))); }
HostPicture HostPicture::MakeMask() const { return HostPicture(Object::Adopt(MaskOf(Held(*this), true))); }

void HostPicture::Draw(const HostPicture& source, std::int32_t x, std::int32_t y, std::int32_t width,
                       std::int32_t height, std::int32_t sourceX, std::int32_t sourceY,
                       std::int32_t sourceWidth, std::int32_t sourceHeight) const {
  model::Draw(Held(*this), Held(source), {x, y, width, height, sourceX, sourceY, sourceWidth, sourceHeight});
}

std::int32_t GWorld::Width() const { return GWorldOf(*this).Map.Width; }
std::int32_t GWorld::Height() const { return GWorldOf(*this).Map.Height; }
std::int32_t GWorld::Depth() const { return GWorldOf(*this).Map.Depth; }
std::int32_t GWorld::PixelBytes() const { return GWorldOf(*this).Map.PixelBytes; }
Bytes GWorld::Row(std::int32_t y) const {
  quickdraw::PixMap& map = GWorldOf(*this).Map;
  if (y < 0 || y >= map.Height) throw std::out_of_range("a row outside the GWorld");
  return {map.Row(y), map.Row(y) + std::ptrdiff_t{map.Width} * map.PixelBytes};
}

}
