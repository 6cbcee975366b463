#include <cstring>

#include "exchange/exchange.h"
#include "exchange/host_drawing.h"
#include "exchange/picture_lock.h"
#include "image/clip.h"
#include "image/conversion.h"
#include "image/walk.h"

namespace zor {
namespace {

/// A colour's light, once black and the ink have each taken their part.
constexpr Colour<3> InksToLight(Colour<4> c) {
  Colour<3> light{};
  const int black = c.Of[3];
  for (int i = 0; i < 3; ++i) light.Of[i] = Sample(255 - (black + c.Of[i] * (255 - black) / 255));
  return light;
}

constexpr FamilyPair LightPairs[] = {
    Pair<Family::Gray, Family::RGB, GrayToAll>,
    Pair<Family::RGB, Family::RGB, Same<3>>,
    Pair<Family::CMYK, Family::RGB, InksToLight>,
};

/// The planes that are read, as those of a family.
struct Reading {
  Family Of = Family::None;
  PlaneList Planes;
};

Reading ReadingOfColours(const PictureData& image, std::int32_t x) {
  return {FamilyOf(image), PlanesOf(GroupOf(image), image, x)};
}

Reading ReadingOfAlpha(const PictureData& image, std::int32_t x) {
  if (!image.HasAlpha) return {};
  return {Family::Gray, {1, image.PixelSize, {image.AlphaOffset + x * image.PixelSize}}};
}

/// What is written in front of red, green and blue where a pixel has 4 bytes.
Sample TopByte(HostLayout layout) { return layout == HostLayout::RowTable ? 0x7F : 0xFF; }

bool WriteRows(PictureData& image, const Rectangle& r, const Reading& reading, HostPictureLock& lock) {
  const PlaneList into = ColoursOf(lock);
  const RowConversion toLight =
      Find(LightPairs, reading.Of, reading.Planes, Family::RGB, into, AlphaRule::None);
  const Sample top = TopByte(lock.Layout);
  return Walk(Yielding(From(image, r.Y))).Rows(r.Height, [&](std::int32_t, const Sample* row) {
    if (lock.PixelBytes == 4) std::memset(lock.CurrentRow, top, std::size_t(r.Width) * 4);
    toLight(row, lock.CurrentRow, r.Width);
    AdvanceLockRow(lock);
  });
}

template <class ReadingOf>
HostPicture* Export(PictureData& image, const Rectangle& rectangle, ReadingOf&& readingOf) {
  const Rectangle r = FilterRect(image, rectangle);
  const Reading reading = readingOf(image, r.X);
  if (r.Empty() || reading.Of == Family::None || !Usable(image)) return nullptr;
  MayYield(image);
  HostPictureLock lock;
  if (!LockNewPicture(lock, r.Width, r.Height)) return nullptr;
  MayYield(image);
  return WriteRows(image, r, reading, lock) ? FinishPictureLock(lock) : nullptr;
}

}

HostPicture* CopyPicture(PictureZOR* self, Integer x, Integer y, Integer w, Integer h) {
  return Export(DataOf(self), {x, y, w, h}, ReadingOfColours);
}

HostPicture* CopyMask(PictureZOR* self, Integer x, Integer y, Integer w, Integer h) {
  return Export(DataOf(self), {x, y, w, h}, ReadingOfAlpha);
}

HostPicture* CopyPictureWithMask(PictureZOR* self, Integer x, Integer y, Integer w, Integer h) {
  HostPicture* picture = CopyPicture(self, x, y, w, h);
  const HeldPicture mask(CopyMask(self, x, y, w, h));
  // A host that has no masks still gives the colours.
  ApplyMaskToPicture(picture, mask.get(), w, h);
  return picture;
}

HostPicture* CopyPicture(PictureZOR* self) {
  return CopyPicture(self, 0, 0, DataOf(self).Width, DataOf(self).Height);
}
HostPicture* CopyMask(PictureZOR* self) {
  return CopyMask(self, 0, 0, DataOf(self).Width, DataOf(self).Height);
}
HostPicture* CopyPictureWithMask(PictureZOR* self) {
  return CopyPictureWithMask(self, 0, 0, DataOf(self).Width, DataOf(self).Height);
}

HostPicture* DebugPicture(PictureZOR* self, Word) {
  return DataOf(self).DebugPictureEnabled ? CopyPictureWithMask(self, 0, 0, 512, 512) : nullptr;
}

}
