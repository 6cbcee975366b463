#include <algorithm>
#include <limits>
#include <utility>

#include "image/formats.h"
#include "image/groups.h"
#include "image/image.h"
#include "image/lifecycle.h"

namespace zor {
namespace {

using Offset = std::int32_t PictureData::*;
using Flag = bool PictureData::*;

/// A plane's fields in the record.
struct PlaneFields {
  Flag Has;
  Offset At;
};

constexpr PlaneFields Red{&PictureData::HasRed, &PictureData::RedOffset},
    Green{&PictureData::HasGreen, &PictureData::GreenOffset},
    Blue{&PictureData::HasBlue, &PictureData::BlueOffset},
    Gray{&PictureData::HasGray, &PictureData::GrayOffset},
    Alpha{&PictureData::HasAlpha, &PictureData::AlphaOffset},
    Cyan{&PictureData::HasCyan, &PictureData::CyanOffset},
    Magenta{&PictureData::HasMagenta, &PictureData::MagentaOffset},
    Yellow{&PictureData::HasYellow, &PictureData::YellowOffset},
    Black{&PictureData::HasBlack, &PictureData::BlackOffset};

constexpr PlaneFields AllPlanes[] = {Red, Green, Blue, Gray, Alpha, Cyan, Magenta, Yellow, Black};

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
  return parent.*plane.Has ? PlaneView(self, parent.*plane.At) : nullptr;
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
      data.*plane.At = data.ChannelOffsets[std::size_t(c)] = parent.*plane.At;
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

PictureZOR* AlphaChannel(PictureZOR* self) { return ChannelView(self, Alpha); }
PictureZOR* RedChannel(PictureZOR* self) { return ChannelView(self, Red); }
PictureZOR* GreenChannel(PictureZOR* self) { return ChannelView(self, Green); }
PictureZOR* BlueChannel(PictureZOR* self) { return ChannelView(self, Blue); }
PictureZOR* GrayChannel(PictureZOR* self) { return ChannelView(self, Gray); }
PictureZOR* CyanChannel(PictureZOR* self) { return ChannelView(self, Cyan); }
PictureZOR* MagentaChannel(PictureZOR* self) { return ChannelView(self, Magenta); }
PictureZOR* YellowChannel(PictureZOR* self) { return ChannelView(self, Yellow); }
PictureZOR* BlackChannel(PictureZOR* self) { return ChannelView(self, Black); }

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
  static constexpr PlaneOrder orders[] = {{FormatRGB, FormatXRGB, {Red, Green, Blue, {}}},
                                          {FormatBGR, FormatXBGR, {Blue, Green, Red, {}}}};
  return ColoursView(self, &PictureData::IsRGB, 3, orders);
}

PictureZOR* CMYKChannels(PictureZOR* self) {
  static constexpr PlaneOrder orders[] = {{FormatCMYK, FormatXCMYK, {Cyan, Magenta, Yellow, Black}},
                                          {FormatKYMC, FormatXKYMC, {Black, Yellow, Magenta, Cyan}}};
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
  data.ChannelCount = parent.ChannelCount;
  for (std::size_t c = 0; c < std::size_t(parent.ChannelCount); ++c)
    data.ChannelOffsets[c] = Saturated(parent.ChannelOffsets[c] + shift);
  for (const PlaneFields& plane : AllPlanes)
    if (parent.*plane.Has) {
      data.*plane.Has = true;
      data.*plane.At = Saturated(parent.*plane.At + shift);
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
