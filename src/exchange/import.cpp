#include <algorithm>

#include "exchange/exchange.h"
#include "exchange/host_drawing.h"
#include "exchange/masked_rows.h"
#include "exchange/picture_lock.h"
#include "image/clip.h"
#include "image/conversion.h"
#include "image/formats.h"
#include "image/walk.h"

namespace zor {
namespace {

bool HasColours(const PictureData& image) { return image.HasRed && image.HasGreen && image.HasBlue; }

/// All of a picture, to land at a place.
CopyBlock WholeAt(HostPicture* pic, Integer x, Integer y) {
  return {{x, y, HostPictureWidth(pic), HostPictureHeight(pic)}, 0, 0};
}

void SkipRows(HostPictureLock& lock, std::int32_t rows) {
  for (std::int32_t y = 0; y < rows; ++y) AdvanceLockRow(lock);
}

enum HostColour { HostRed, HostGreen, HostBlue };

void DrawToGrayChannel(PictureData& image, HostPicture* pic, const CopyBlock& block, HostColour colour) {
  if (!image.HasGray || !Usable(image)) return;
  MayYield(image);
  HostPictureLock lock;
  if (!LockPictureForReading(lock, pic)) return;
  const CopyBlock part = CopyRect(image, lock.Width, lock.Height, block);
  const PlaneList from{1, lock.PixelBytes, {ColoursOf(lock, part.SourceX).Offset[colour]}};
  const PlaneList into{1, image.PixelSize, {image.GrayOffset + part.Dest.X * image.PixelSize}};
  if (part.Dest.Empty()) return;
  const RowConversion copy(Pair<Family::Gray, Family::Gray, Same<1>>, AlphaRule::None, from, into);
  SkipRows(lock, part.SourceY);
  Walk(Into(image, part.Dest.Y)).Rows(part.Dest.Height, [&](std::int32_t, Sample* row) {
    copy(lock.CurrentRow, row, part.Dest.Width);
    AdvanceLockRow(lock);
  });
}

void DrawColours(PictureData& image, HostPictureLock& lock, const CopyBlock& block) {
  const CopyBlock part = CopyRect(image, lock.Width, lock.Height, block);
  if (part.Dest.Empty()) return;
  MayYield(image);
  const PlaneList from = ColoursOf(lock, part.SourceX), into = PlanesOf(Group::RGB, image, part.Dest.X);
  const RowConversion copy(Pair<Family::RGB, Family::RGB, Same<3>>, AlphaRule::None, from, into);
  SkipRows(lock, part.SourceY);
  Walk(Yielding(Into(image, part.Dest.Y))).Rows(part.Dest.Height, [&](std::int32_t, Sample* row) {
    copy(lock.CurrentRow, row, part.Dest.Width);
    AdvanceLockRow(lock);
  });
}

void DrawPictureRGB(PictureData& image, HostPicture* pic, const CopyBlock& block) {
  if (!HasColours(image) || !Usable(image)) return;
  MayYield(image);
  if (HostPictureLock lock; LockPictureForReading(lock, pic)) DrawColours(image, lock, block);
  MayYield(image);
}

/// Red, green, blue and the place of alpha: the alpha plane, or the byte in front of the colours that a
/// format without alpha leaves free there. Three planes where there is neither.
PlaneList PlanesWithAlpha(const PictureData& image) {
  PlaneList planes = PlanesOf(Group::RGB, image);
  const bool freeInFront = image.ImageFormat == FormatXRGB || image.ImageFormat == FormatXBGR;
  if (!image.HasAlpha && !freeInFront) return planes;
  planes.Offset[3] = image.HasAlpha ? image.AlphaOffset : std::min(planes.Offset[0], planes.Offset[2]) - 1;
  planes.Count = 4;
  return planes;
}

/// A picture without a mask has one that is white everywhere.
constexpr Sample White = 255;

void DrawThroughMask(PictureData& image, HostPictureLock& lock, HostPictureLock* maskLock,
                     const CopyBlock& block, PlaneList into, MaskUse use) {
  const CopyBlock part = CopyRect(image, lock.Width, lock.Height, block);
  const Rectangle& dest = part.Dest;
  // The mask is taken to be as large as the picture; one that is narrower can't be read.
  if (dest.Empty() || (maskLock && (maskLock->Height < 1 || maskLock->Width - part.SourceX < dest.Width)))
    return;
  const PlaneList from = ColoursOf(lock, part.SourceX);
  const PlaneList fromMask = maskLock ? ColoursOf(*maskLock, part.SourceX) : PlaneList{3, 0, {}};
  for (int c = 0; c < into.Count; ++c) into.Offset[c] += dest.X * into.Step;
  SkipRows(lock, part.SourceY);
  if (maskLock) SkipRows(*maskLock, part.SourceY);
  const MaskedRows draw(use, from, fromMask, into, dest.Width);
  Walk(Yielding(Into(image, dest.Y))).Rows(dest.Height, [&](std::int32_t, Sample* row) {
    draw(lock.CurrentRow, maskLock ? maskLock->CurrentRow : &White, row);
    AdvanceLockRow(lock);
    if (maskLock) AdvanceLockRow(*maskLock);
  });
}

void DrawThroughMask(PictureData& image, HostPicture* pic, HostPicture* mask, const CopyBlock& block,
                     const PlaneList& into, MaskUse use) {
  if (!Usable(image)) return;
  MayYield(image);
  {
    HostPictureLock lock, maskLock;
    if (LockPictureForReading(lock, pic) && (!mask || LockPictureForReading(maskLock, mask)))
      DrawThroughMask(image, lock, mask ? &maskLock : nullptr, block, into, use);
  }
  MayYield(image);
}

/// The mask comes with a reference, as all that this host gives.
HeldPicture MaskOf(HostPicture* pic) { return HeldPicture(pic ? REALGetPictureMask(pic, 0, 0, 0) : nullptr); }

void DrawMaskedPictureRGB(PictureData& image, HostPicture* pic, const CopyBlock& block, Boolean invertMask) {
  if (!HasColours(image)) return;
  const HeldPicture mask = MaskOf(pic);
  DrawThroughMask(image, pic, mask.get(), block, PlanesWithAlpha(image), {MaskUse::Alpha, invertMask != 0});
}

void DrawMaskedPictureApplyMaskRGB(PictureData& image, HostPicture* pic, const CopyBlock& block,
                                   Boolean invertMask) {
  if (!HasColours(image)) return;
  const HeldPicture mask = MaskOf(pic);
  if (!mask) return DrawPictureRGB(image, pic, block);
  DrawThroughMask(image, pic, mask.get(), block, PlanesOf(Group::RGB, image),
                  {MaskUse::Blend, invertMask != 0});
}

}

void DrawPictureRedToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                 Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY) {
  DrawToGrayChannel(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, sourceX, sourceY}, HostRed);
}
void DrawPictureRedToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                 Integer destWidth, Integer destHeight) {
  DrawToGrayChannel(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, 0, 0}, HostRed);
}
void DrawPictureGreenToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY) {
  DrawToGrayChannel(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, sourceX, sourceY}, HostGreen);
}
void DrawPictureGreenToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight) {
  DrawToGrayChannel(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, 0, 0}, HostGreen);
}
void DrawPictureBlueToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                  Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY) {
  DrawToGrayChannel(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, sourceX, sourceY}, HostBlue);
}
void DrawPictureBlueToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                  Integer destWidth, Integer destHeight) {
  DrawToGrayChannel(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, 0, 0}, HostBlue);
}

void DrawPictureRGB(PictureZOR* self, HostPicture* pic) {
  DrawPictureRGB(DataOf(self), pic, WholeAt(pic, 0, 0));
}
void DrawPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY) {
  DrawPictureRGB(DataOf(self), pic, WholeAt(pic, destX, destY));
}
void DrawPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                    Integer destHeight) {
  DrawPictureRGB(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, 0, 0});
}
void DrawPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                    Integer destHeight, Integer sourceX, Integer sourceY) {
  DrawPictureRGB(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, sourceX, sourceY});
}

void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Boolean invertMask) {
  DrawMaskedPictureRGB(DataOf(self), pic, WholeAt(pic, 0, 0), invertMask);
}
void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                          Boolean invertMask) {
  DrawMaskedPictureRGB(DataOf(self), pic, WholeAt(pic, destX, destY), invertMask);
}
void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                          Integer destHeight, Boolean invertMask) {
  DrawMaskedPictureRGB(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, 0, 0}, invertMask);
}
void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                          Integer destHeight, Integer sourceX, Integer sourceY, Boolean invertMask) {
  DrawMaskedPictureRGB(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, sourceX, sourceY},
                       invertMask);
}

void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Boolean invertMask) {
  DrawMaskedPictureApplyMaskRGB(DataOf(self), pic, WholeAt(pic, 0, 0), invertMask);
}
void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Boolean invertMask) {
  DrawMaskedPictureApplyMaskRGB(DataOf(self), pic, WholeAt(pic, destX, destY), invertMask);
}
void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight, Boolean invertMask) {
  DrawMaskedPictureApplyMaskRGB(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, 0, 0}, invertMask);
}
void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY,
                                   Boolean invertMask) {
  DrawMaskedPictureApplyMaskRGB(DataOf(self), pic, {{destX, destY, destWidth, destHeight}, sourceX, sourceY},
                                invertMask);
}

}
