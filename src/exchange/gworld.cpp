#include <cstring>
#include <limits>

#include "exchange/exchange.h"
#include "exchange/picture_lock.h"
#include "image/conversion.h"
#include "image/walk.h"

namespace zor {
namespace {

constexpr std::int32_t GrayRamp = 40;

struct DisposeOfGWorld {
  void operator()(void* gworld) const { DisposeGWorld(gworld); }
};
using OwnGWorld = std::unique_ptr<void, DisposeOfGWorld>;

/// Bits of a pixel for an image; 0 where a GWorld can't hold it.
std::int32_t DepthFor(const PictureData& image) {
  return image.IsGray ? 8 : !image.IsRGB ? 0 : image.HasAlpha ? 32 : 24;
}

OwnGWorld MakeGWorld(const PictureData& image, std::int32_t depth) {
  // The bounds take 16 bits; beyond them the GWorld would have another size than the image.
  constexpr std::int32_t most = std::numeric_limits<std::uint16_t>::max();
  if (image.Width > most || image.Height > most) return nullptr;
  const QuickDrawBounds bounds{0, 0, std::int16_t(image.Height), std::int16_t(image.Width)};
  void* gworld = nullptr;
  const bool failed =
      NewGWorld(&gworld, depth, &bounds, depth == 8 ? GetCTable(GrayRamp) : nullptr, nullptr, 0) != 0;
  OwnGWorld made(gworld);
  return failed ? nullptr : std::move(made);
}

/// The pixels of a GWorld that is locked: bytes of a pixel, whether a byte 255 stands in front, and what
/// makes them of the image's.
struct GWorldRows {
  Sample* First;
  std::int32_t RowBytes, Step;
  bool Opaque;
  RowConversion Convert;
};

GWorldRows RowsFor(const PictureData& image, std::int32_t depth, void* pixMap) {
  auto* first = static_cast<Sample*>(GetPixBaseAddr(pixMap));
  const std::int32_t rowBytes = GetPixRowBytes(pixMap);
  const PlaneList planes = PlanesOf(GroupOf(image), image), gray{1, 1, {0}}, inFront{4, 4, {1, 2, 3, 0}},
                  packed{3, 3, {0, 1, 2}};
  constexpr FamilyPair grays = Pair<Family::Gray, Family::Gray, Same<1>>;
  constexpr FamilyPair colours = Pair<Family::RGB, Family::RGB, Same<3>>;
  if (depth == 8) return {first, rowBytes, 1, false, {grays, AlphaRule::None, planes, gray}};
  if (depth == 32) return {first, rowBytes, 4, false, {colours, AlphaRule::Copy, planes, inFront}};
  // The rows that came of it say whether a pixel of 24 bits takes 3 bytes or 4.
  if (rowBytes < std::int64_t{image.Width} * 4)
    return {first, rowBytes, 3, false, {colours, AlphaRule::None, planes, packed}};
  return {first, rowBytes, 4, true, {colours, AlphaRule::None, planes, inFront}};
}

bool CopyInto(const GWorldRows& rows, PictureData& image) {
  const std::int64_t used = std::int64_t{image.Width} * rows.Step;
  if (!rows.First || rows.RowBytes < used) return false;
  return Walk(From(image)).Rows(image.Height, [&](std::int32_t y, const Sample* row) {
    Sample* into = rows.First + std::ptrdiff_t{y} * rows.RowBytes;
    if (rows.Opaque) std::memset(into, 255, std::size_t(used));
    rows.Convert(row, into, image.Width);
  });
}

}

Variant* CopyGWorld(PictureZOR* self) {
  PictureData& image = DataOf(self);
  if (!Usable(image)) return nullptr;
  MayYield(image);
  const std::int32_t depth = DepthFor(image);
  // In this order, since a GWorld goes before the instance that it was meant for.
  HeldObject instance;
  OwnGWorld gworld = depth ? MakeGWorld(image, depth) : nullptr;
  if (!gworld) return nullptr;
  instance.reset(PluginNewInstance("GWorldZOR"));
  void* pixMap = instance ? GetGWorldPixMap(gworld.get()) : nullptr;
  if (!pixMap || !LockPixels(pixMap)) return nullptr;
  if (!CopyInto(RowsFor(image, depth, pixMap), image)) {
    UnlockPixels(pixMap);
    return nullptr;
  }
  // The pixels stay locked: the instance's owner draws from them.
  auto* bytes = static_cast<char*>(instance.get());
  void* owned = gworld.release();
  std::memcpy(bytes + GWorldAt, &owned, sizeof owned);
  bytes[GWorldMarkAt] = 1;
  return static_cast<Variant*>(instance.release());
}

}
