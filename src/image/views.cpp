#include <algorithm>
#include <limits>
#include <utility>

#include "image/formats.h"
#include "image/image.h"
#include "image/lifecycle.h"
#include "image/plane_fields.h"

namespace zor {
namespace {

using Flag = bool PictureData::*;

constexpr PlaneFields AllPlanes[] = {RedPlane,  GreenPlane,   BluePlane,   GrayPlane, AlphaPlane,
                                     CyanPlane, MagentaPlane, YellowPlane, BlackPlane};

std::int32_t Saturated(std::int64_t value) {
  using Limits = std::numeric_limits<std::int32_t>;
  return std::int32_t(std::clamp<std::int64_t>(value, Limits::min(), Limits::max()));
}

/// A new picture that has its parent's size and rows, and nothing of its layout or store yet.
Held NewView(PictureZOR* self) {
  const PictureData& parent = DataOf(self);
  Held view{NewPictureObject()};
  if (!view) return view;
  PictureData& data = view.Data();
  data.Valid = parent.Valid;
  data.RowGetter = parent.RowGetter;
  data.PixelSize = parent.PixelSize;
  data.RowSize = parent.RowSize;
  data.Width = parent.Width;
  data.Height = parent.Height;
  data.RowOffset = parent.RowOffset;
  data.LeftEdge = parent.LeftEdge;
  data.TotalSize = parent.TotalSize;
  data.Parent = Locked(self);
  data.Target = Locked(parent.Target);
  return view;
}

PictureZOR* OnStoreOf(PictureZOR* self, Held view) {
  ShareStore(view.Data(), DataOf(self));
  return view.HandOn();
}

PictureZOR* PlaneView(PictureZOR* self, std::int32_t offset) {
  Held view = NewView(self);
  if (!view) return nullptr;
  PictureData& data = view.Data();
  data.ImageFormat = FormatG;
  data.IsGray = data.HasGray = true;
  data.GrayOffset = data.ChannelOffsets[0] = offset;
  data.ChannelCount = 1;
  return OnStoreOf(self, std::move(view));
}

PictureZOR* ChannelView(PictureZOR* self, PlaneFields plane) {
  const PictureData& parent = DataOf(self);
  return parent.*plane.Has ? PlaneView(self, parent.*plane.Offset) : nullptr;
}

/// The formats of a family whose planes stand in one order, and the format of a view on them.
struct PlaneOrder {
  std::int32_t First, Last;
  std::array<PlaneFields, 4> Planes;
};

/// A view of the colours of a family; nil when no order fits the format.
PictureZOR* ColoursView(PictureZOR* self, Flag family, int count, const PlaneOrder (&orders)[2]) {
  const PictureData& parent = DataOf(self);
  if (!(parent.*family)) return nullptr;
  for (const PlaneOrder& order : orders) {
    if (parent.ImageFormat < order.First || parent.ImageFormat > order.Last) continue;
    Held view = NewView(self);
    if (!view) return nullptr;
    PictureData& data = view.Data();
    data.ImageFormat = order.First;
    data.*family = true;
    data.ChannelCount = count;
    for (int c = 0; c < count; ++c) {
      const PlaneFields plane = order.Planes[std::size_t(c)];
      data.*plane.Has = true;
      data.*plane.Offset = data.ChannelOffsets[std::size_t(c)] = parent.*plane.Offset;
    }
    return OnStoreOf(self, std::move(view));
  }
  return nullptr;
}

/// The clipping of one axis: a view's first line and its number of lines, 0 or less outside the picture.
struct Span {
  std::int64_t First, Count;
};

Span ClipSpan(std::int64_t first, std::int64_t count, std::int32_t size) {
  if (count < 0) {
    first += count;
    count = -count;
  }
  if (first < 0) {
    count += first;
    first = 0;
  }
  if (first >= size) count = 0;
  return {first, std::min(count, size - first)};
}

}

PictureZOR* AlphaChannel(PictureZOR* self) { return ChannelView(self, AlphaPlane); }
PictureZOR* RedChannel(PictureZOR* self) { return ChannelView(self, RedPlane); }
PictureZOR* GreenChannel(PictureZOR* self) { return ChannelView(self, GreenPlane); }
PictureZOR* BlueChannel(PictureZOR* self) { return ChannelView(self, BluePlane); }
PictureZOR* GrayChannel(PictureZOR* self) { return ChannelView(self, GrayPlane); }
PictureZOR* CyanChannel(PictureZOR* self) { return ChannelView(self, CyanPlane); }
PictureZOR* MagentaChannel(PictureZOR* self) { return ChannelView(self, MagentaPlane); }
PictureZOR* YellowChannel(PictureZOR* self) { return ChannelView(self, YellowPlane); }
PictureZOR* BlackChannel(PictureZOR* self) { return ChannelView(self, BlackPlane); }

PictureZOR* Channel(PictureZOR* self, Integer index) {
  const PictureData& parent = DataOf(self);
  if (index < 0) {
    RaiseHostException("OutOfBoundsException", "Channel index < 0");
    return nullptr;
  }
  if (index >= parent.ChannelCount) {
    RaiseHostException("OutOfBoundsException", "Channel index >= ChannelCount");
    return nullptr;
  }
  return PlaneView(self, parent.ChannelOffsets[std::size_t(index)]);
}

PictureZOR* RGBChannels(PictureZOR* self) {
  static constexpr PlaneOrder orders[] = {{FormatRGB, FormatXRGB, {RedPlane, GreenPlane, BluePlane, {}}},
                                          {FormatBGR, FormatXBGR, {BluePlane, GreenPlane, RedPlane, {}}}};
  return ColoursView(self, &PictureData::IsRGB, 3, orders);
}

PictureZOR* CMYKChannels(PictureZOR* self) {
  static constexpr PlaneOrder orders[] = {
      {FormatCMYK, FormatXCMYK, {CyanPlane, MagentaPlane, YellowPlane, BlackPlane}},
      {FormatKYMC, FormatXKYMC, {BlackPlane, YellowPlane, MagentaPlane, CyanPlane}}};
  return ColoursView(self, &PictureData::IsCMYK, 4, orders);
}

PictureZOR* ClipImage(PictureZOR* self, Integer x, Integer y, Integer width, Integer height) {
  const PictureData& parent = DataOf(self);
  const Span columns = ClipSpan(x, width, parent.Width), rows = ClipSpan(y, height, parent.Height);
  Held view = NewView(self);
  if (!view) return nullptr;
  PictureData& data = view.Data();
  data.ImageFormat = parent.ImageFormat;
  data.IsGray = parent.IsGray;
  data.IsRGB = parent.IsRGB;
  data.IsCMYK = parent.IsCMYK;
  data.Width = Saturated(columns.Count);
  data.Height = Saturated(rows.Count);
  data.RowOffset = Saturated(parent.RowOffset + rows.First);
  data.MemoryTarget = Locked(parent.MemoryTarget);

  const std::int64_t shift = columns.First * parent.PixelSize;
  data.LeftEdge = Saturated(parent.LeftEdge + shift);
  data.ChannelCount = parent.ChannelCount;
  for (std::size_t c = 0; c < std::size_t(parent.ChannelCount); ++c)
    data.ChannelOffsets[c] = Saturated(parent.ChannelOffsets[c] + shift);
  for (const PlaneFields& plane : AllPlanes)
    if (parent.*plane.Has) {
      data.*plane.Has = true;
      data.*plane.Offset = Saturated(parent.*plane.Offset + shift);
    }
  return OnStoreOf(self, std::move(view));
}

PictureZOR* ClipImage(PictureZOR* self) {
  const PictureData& parent = DataOf(self);
  return ClipImage(self, 0, 0, parent.Width, parent.Height);
}

PictureZOR* MirroredView(PictureZOR* self) {
  PictureZOR* view = ClipImage(self);
  if (!view) return nullptr;
  PictureData& data = DataOf(view);
  data.RowGetter = Mirrored(data.RowGetter);
  // Moves a mapped view's window to where its first row is.
  if (data.RowGetter) data.RowGetter(&data, 0);
  return view;
}

}
