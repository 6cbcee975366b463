#include "invoke.h"

// To and from host pictures: a member a row of the class.

namespace picturezor {

using namespace model;

HostPicture Picture::CopyPicture() const { return Invoke<HostPicture>(*this, "CopyPicture"); }
HostPicture Picture::CopyPicture(const Rect& r) const {
  return Invoke<HostPicture>(*this, "CopyPicture", r.X, r.Y, r.Width, r.Height);
}
HostPicture Picture::CopyMask() const { return Invoke<HostPicture>(*this, "CopyMask"); }
HostPicture Picture::CopyMask(const Rect& r) const {
  return Invoke<HostPicture>(*this, "CopyMask", r.X, r.Y, r.Width, r.Height);
}
HostPicture Picture::CopyPictureWithMask() const { return Invoke<HostPicture>(*this, "CopyPictureWithMask"); }
HostPicture Picture::CopyPictureWithMask(const Rect& r) const {
  return Invoke<HostPicture>(*this, "CopyPictureWithMask", r.X, r.Y, r.Width, r.Height);
}
GWorld Picture::CopyGWorld() const { return Invoke<GWorld>(*this, "CopyGWorld"); }

void Picture::DrawPictureRedToGrayChannel(const HostPicture& picture, const Rect& r) const {
  Invoke<void>(*this, "DrawPictureRedToGrayChannel", picture, r.X, r.Y, r.Width, r.Height);
}
void Picture::DrawPictureRedToGrayChannel(const HostPicture& picture, const Rect& r, std::int32_t sourceX,
                                          std::int32_t sourceY) const {
  Invoke<void>(*this, "DrawPictureRedToGrayChannel", picture, r.X, r.Y, r.Width, r.Height, sourceX, sourceY);
}
void Picture::DrawPictureGreenToGrayChannel(const HostPicture& picture, const Rect& r) const {
  Invoke<void>(*this, "DrawPictureGreenToGrayChannel", picture, r.X, r.Y, r.Width, r.Height);
}
void Picture::DrawPictureGreenToGrayChannel(const HostPicture& picture, const Rect& r, std::int32_t sourceX,
                                            std::int32_t sourceY) const {
  Invoke<void>(*this, "DrawPictureGreenToGrayChannel", picture, r.X, r.Y, r.Width, r.Height, sourceX,
               sourceY);
}
void Picture::DrawPictureBlueToGrayChannel(const HostPicture& picture, const Rect& r) const {
  Invoke<void>(*this, "DrawPictureBlueToGrayChannel", picture, r.X, r.Y, r.Width, r.Height);
}
void Picture::DrawPictureBlueToGrayChannel(const HostPicture& picture, const Rect& r, std::int32_t sourceX,
                                           std::int32_t sourceY) const {
  Invoke<void>(*this, "DrawPictureBlueToGrayChannel", picture, r.X, r.Y, r.Width, r.Height, sourceX, sourceY);
}

void Picture::DrawPictureRGB(const HostPicture& picture) const {
  Invoke<void>(*this, "DrawPictureRGB", picture);
}
void Picture::DrawPictureRGB(const HostPicture& picture, std::int32_t x, std::int32_t y) const {
  Invoke<void>(*this, "DrawPictureRGB", picture, x, y);
}
void Picture::DrawPictureRGB(const HostPicture& picture, const Rect& r) const {
  Invoke<void>(*this, "DrawPictureRGB", picture, r.X, r.Y, r.Width, r.Height);
}
void Picture::DrawPictureRGB(const HostPicture& picture, const Rect& r, std::int32_t sourceX,
                             std::int32_t sourceY) const {
  Invoke<void>(*this, "DrawPictureRGB", picture, r.X, r.Y, r.Width, r.Height, sourceX, sourceY);
}

void Picture::DrawMaskedPictureRGB(const HostPicture& picture, bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureRGB", picture, invertMask);
}
void Picture::DrawMaskedPictureRGB(const HostPicture& picture, std::int32_t x, std::int32_t y,
                                   bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureRGB", picture, x, y, invertMask);
}
void Picture::DrawMaskedPictureRGB(const HostPicture& picture, const Rect& r, bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureRGB", picture, r.X, r.Y, r.Width, r.Height, invertMask);
}
void Picture::DrawMaskedPictureRGB(const HostPicture& picture, const Rect& r, std::int32_t sourceX,
                                   std::int32_t sourceY, bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureRGB", picture, r.X, r.Y, r.Width, r.Height, sourceX, sourceY,
               invertMask);
}

void Picture::DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureApplyMaskRGB", picture, invertMask);
}
void Picture::DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, std::int32_t x, std::int32_t y,
                                            bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureApplyMaskRGB", picture, x, y, invertMask);
}
void Picture::DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, const Rect& r,
                                            bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureApplyMaskRGB", picture, r.X, r.Y, r.Width, r.Height, invertMask);
}
void Picture::DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, const Rect& r, std::int32_t sourceX,
                                            std::int32_t sourceY, bool invertMask) const {
  Invoke<void>(*this, "DrawMaskedPictureApplyMaskRGB", picture, r.X, r.Y, r.Width, r.Height, sourceX, sourceY,
               invertMask);
}

}
