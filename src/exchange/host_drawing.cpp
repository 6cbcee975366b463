#include "exchange/host_drawing.h"

#include <cstring>

#include "exchange/picture_lock.h"

namespace zor {
namespace {

/// Where a picture is drawn, and which part of it. From the top left corner, in its own size, the rows can be
/// copied too.
struct Drawing {
  std::int32_t X, Y, Width, Height, SourceX, SourceY, SourceWidth, SourceHeight;

  bool KeepsPixels() const {
    return X == 0 && Y == 0 && SourceX == 0 && SourceY == 0 && Width == SourceWidth && Height == SourceHeight;
  }
};

using DrawPictureMethod = void (*)(void* graphics, HostPicture* image, std::int32_t x, std::int32_t y,
                                   std::int32_t w, std::int32_t h, std::int32_t sx, std::int32_t sy,
                                   std::int32_t sw, std::int32_t sh);
constexpr char DrawPictureDeclaration[] =
    "DrawPicture(Image as Picture, x as Integer, y as Integer, w as Integer, h as Integer, "
    "sx as Integer = 0, sy as Integer = 0, sw as Integer = -10000, sh as Integer = -10000)";

bool CopyRows(const RowTableRecord& from, const RowTableRecord& into) {
  if (!from.Usable() || !into.Usable() || from.Width != into.Width || from.Height != into.Height ||
      from.Width < 0)
    return false;
  for (std::int32_t y = 0; y < from.Height; ++y)
    std::memmove(into.Rows[y], from.Rows[y], std::size_t(from.Width) * 4);
  return true;
}

/// For hosts whose pictures are tables of rows.
bool CopyRowsBetweenPictures(HostPicture* target, HostPicture* source, const Drawing& drawing) {
  if (!target || !source || !drawing.KeepsPixels()) return false;
  PictureDescription from{}, into{};
  if (!REALLockPictureDescription(source, &from, RowTableForm)) return false;
  bool copied = false;
  if (REALLockPictureDescription(target, &into, RowTableForm)) {
    copied = CopyRows(ReadRowTable(from), ReadRowTable(into));
    unlockPictureDescription(target);
  }
  unlockPictureDescription(source);
  REALPictureClearCache(target);
  return copied;
}

bool DrawHostPicture(void* graphics, HostPicture* target, HostPicture* source, const Drawing& d) {
  void* method = graphics && source ? REALLoadObjectMethod(graphics, DrawPictureDeclaration) : nullptr;
  if (!method) return CopyRowsBetweenPictures(target, source, d);
  reinterpret_cast<DrawPictureMethod>(method)(graphics, source, d.X, d.Y, d.Width, d.Height, d.SourceX,
                                              d.SourceY, d.SourceWidth, d.SourceHeight);
  return true;
}

std::int32_t SizeOf(HostPicture* picture, const char* property) {
  std::int32_t value = 0;
  return picture && REALGetPropValueInt(picture, property, &value) ? value : 0;
}

}

HostPicture* ConvertToFreshPicture(HostPicture* picture, std::int32_t width, std::int32_t height) {
  if (!picture || width < 1 || height < 1) return nullptr;
  HostPicture* fresh = newPicture(width, height, 32);
  if (!fresh) return nullptr;
  if (const HeldObject graphics{pluginPictureGraphicsGetter(fresh)})
    DrawHostPicture(graphics.get(), fresh, picture, {0, 0, width, height, 0, 0, width, height});
  return fresh;
}

bool ApplyMaskToPicture(HostPicture* picture, HostPicture* mask, std::int32_t width, std::int32_t height) {
  if (width < 1 || height < 1 || !picture) return false;
  if (!mask) return true;
  const HeldPicture target(REALGetPictureMask(picture, 1, width, height));
  if (!target) return false;
  const HeldObject graphics{pluginPictureGraphicsGetter(target.get())};
  return DrawHostPicture(graphics.get(), target.get(), mask, {0, 0, width, height, 0, 0, width, height});
}

std::int32_t HostPictureWidth(HostPicture* picture) { return SizeOf(picture, "Width"); }
std::int32_t HostPictureHeight(HostPicture* picture) { return SizeOf(picture, "Height"); }

}
