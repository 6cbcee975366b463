#include "exchange/exchange.h"
#include "frame/host_services.h"
#include "image/formats.h"
#include "image/lifecycle.h"
#include "image/stores.h"

namespace zor {
namespace {

/// Writes the layout of a GWorld's pixels, plane by plane: the channels stay uncounted, so that `Channel` has
/// none to number. False for any other depth.
bool LayOut(PictureData& data, std::int32_t depth, bool useAlpha) {
  if (depth != 24 && depth != 32) return false;
  data.PixelSize = depth / 8;
  data.RedOffset = data.PixelSize - 3;
  data.GreenOffset = data.RedOffset + 1;
  data.BlueOffset = data.RedOffset + 2;
  data.HasAlpha = depth == 32 && useAlpha;
  data.ImageFormat = depth == 24 ? FormatRGB : useAlpha ? FormatARGB : FormatXRGB;
  data.IsRGB = data.HasRed = data.HasGreen = data.HasBlue = true;
  return true;
}

}

void Constructor(PictureZOR* self, HostPicture* pic, Boolean useAlpha) {
  PictureData& data = DataOf(self);
  if (!pic || !IsNew(data)) return;
  PictureDescription description{};
  lockPictureDescription(pic, &description);
  unlockPictureDescription(pic);
  if (description.Kind != GWorldForm || !description.Data) return;
  void* pixMap = GetPortPixMap(description.Data);
  void* base = pixMap ? GetPixBaseAddr(pixMap) : nullptr;
  if (!base || !LayOut(data, GetPixDepth(pixMap), useAlpha)) return;
  data.Width = description.Width;
  data.Height = description.Height;
  data.RowSize = GetPixRowBytes(pixMap);
  data.TotalSize = std::int64_t{data.RowSize} * data.Height;
  data.WindowFirstRow = data.WindowLastRow = -1;
  // A host's size below 1, or rows too short for it, would let pixels be written elsewhere.
  if (data.Width < 1 || data.Height < 1 || PackedRowBytes(data) > data.RowSize) return;
  if (!UseHostMemory(data, base, pic)) return;
  data.Target = Locked(pic);
  data.Valid = true;
}

}
