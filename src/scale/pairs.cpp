#include "scale/pairs.h"

#include <algorithm>
#include <cstring>

#include "image/formats.h"

namespace zor {
namespace {

/// A form of a pair. In `Source` a digit is a plane of the source's group, in `Dest` the channel that a plane
/// of dest's group gets, and in `Temp` the channel that a byte of a temporary pixel holds, or - where it is
/// 0.
struct Form {
  const char *Source, *Temp, *Dest;
};
struct PairRow {
  Family From, Into;
  bool Luma;
  Form Plain, WithAlpha;
};

constexpr PairRow Pairs[] = {
    {Family::Gray, Family::Gray, false, {"0", "0", "0"}, {"01", "01", "01"}},
    {Family::Gray, Family::RGB, false, {"0", "-0--", "000"}, {"01", "-0-1", "0001"}},
    {Family::Gray, Family::CMYK, false, {"0", "0000", "0000"}, {"01", "00001", "00001"}},
    {Family::RGB, Family::Gray, true, {"012", "0", "0"}, {"0123", "01", "01"}},
    {Family::RGB, Family::RGB, false, {"012", "012-", "012"}, {"0123", "0123", "0123"}},
    {Family::CMYK, Family::Gray, false, {"3", "0", "0"}, {"34", "01", "01"}},
    {Family::CMYK, Family::CMYK, false, {"0123", "0123", "0123"}, {"01234", "01234", "01234"}},
};

constexpr std::int32_t ScalingFormat[] = {0, FormatScaling1, FormatScaling2,
                                          0, FormatScaling4, FormatScaling5};

Group GroupFor(Family family, bool alpha) {
  const Group plain = family == Family::Gray ? Group::Gray : family == Family::RGB ? Group::RGB : Group::CMYK;
  return Group(int(plain) + (alpha ? 1 : 0));
}

/// The planes by their place in the pixel.
std::array<int, 5> InPixelOrder(const PlaneList& planes) {
  std::array<int, 5> sorted{};
  for (int p = 0; p < planes.Count; ++p) {
    int place = 0;
    for (int other = 0; other < planes.Count; ++other)
      if (planes.Offset[other] < planes.Offset[p]) ++place;
    sorted[place] = p;
  }
  return sorted;
}

/// Numbers the channels in the order of dest's pixel, so that the first pass needs no other.
void NumberAsInDest(ScalePair& pair) {
  const PixelOrder order = OrderOfDest(pair);
  const ScalePair before = pair;
  std::array<int, 5> number{};
  for (int place = 0; place < order.Count; ++place) {
    number[order.Channel[place]] = place;
    pair.Source.Offset[place] = before.Source.Offset[order.Channel[place]];
  }
  for (int p = 0; p < pair.Dest.Count; ++p) pair.ChannelOfPlane[p] = number[before.ChannelOfPlane[p]];
  for (int b = 0; b < pair.Temp.Count; ++b)
    if (before.Temp.Channel[b] != PixelOrder::Zero) pair.Temp.Channel[b] = number[before.Temp.Channel[b]];
}

ScalePair Filled(const PairRow& row, const PictureData& source, const PictureData& dest) {
  const bool alpha = source.HasAlpha && dest.HasAlpha;
  const Form& form = alpha ? row.WithAlpha : row.Plain;
  ScalePair pair;
  const PlaneList planes = PlanesOf(GroupFor(row.From, alpha), source);
  pair.Source = {int(std::strlen(form.Source)), planes.Step, {}};
  for (int i = 0; i < pair.Source.Count; ++i) pair.Source.Offset[i] = planes.Offset[form.Source[i] - '0'];
  pair.Luma = row.Luma;
  pair.Channels = row.Luma ? pair.Source.Count - 2 : pair.Source.Count;
  pair.Dest = PlanesOf(GroupFor(row.Into, alpha), dest);
  for (int i = 0; i < pair.Dest.Count; ++i) pair.ChannelOfPlane[i] = form.Dest[i] - '0';
  pair.Temp.Count = int(std::strlen(form.Temp));
  for (int i = 0; i < pair.Temp.Count; ++i)
    pair.Temp.Channel[i] = form.Temp[i] == '-' ? PixelOrder::Zero : form.Temp[i] - '0';
  pair.TempFormat = ScalingFormat[pair.Temp.Count];
  if (!pair.Luma) NumberAsInDest(pair);
  return pair;
}

}

bool FindScalePair(const PictureData& source, const PictureData& dest, ScalePair& pair) {
  for (const PairRow& row : Pairs)
    if (row.From == FamilyOf(source) && row.Into == FamilyOf(dest)) {
      pair = Filled(row, source, dest);
      return true;
    }
  return false;
}

PixelOrder OrderOfDest(const ScalePair& pair) {
  const std::array<int, 5> planes = InPixelOrder(pair.Dest);
  PixelOrder order;
  for (int place = 0; place < pair.Dest.Count; ++place) {
    const int channel = pair.ChannelOfPlane[planes[place]];
    const auto end = order.Channel.begin() + order.Count;
    if (std::find(order.Channel.begin(), end, channel) == end) order.Channel[order.Count++] = channel;
  }
  return order;
}

PixelScatter::PixelScatter(const ScalePair& pair, const PixelOrder& order) : Order(order), Planes(pair.Dest) {
  const std::array<int, 5> planes = InPixelOrder(Planes);
  Direct = order.Count == Planes.Count && Planes.Count == Planes.Step;
  for (int place = 0; place < Planes.Count; ++place) {
    const int plane = planes[place];
    const auto found =
        std::find(order.Channel.begin(), order.Channel.begin() + order.Count, pair.ChannelOfPlane[plane]);
    PlaceOfPlane[plane] = int(found - order.Channel.begin());
    Direct = Direct && PlaceOfPlane[plane] == place;
  }
}

Sample* PixelScatter::Place(Sample* row, std::int32_t x) const {
  return row + std::ptrdiff_t{x} * Planes.Step + FirstOffset(Planes);
}

void PixelScatter::Store(const Sample* samples, Sample* row, std::int32_t x, std::int32_t count) const {
  if (Direct) {
    std::memcpy(Place(row, x), samples, std::size_t(count) * std::size_t(Order.Count));
    return;
  }
  ForPlaneCount(Planes.Count, [&](auto n) {
    const PlaneRow<n> dest(row + std::ptrdiff_t{x} * Planes.Step, Planes);
    const std::ptrdiff_t step = Order.Count;
    const auto place = PlaceOfPlane;
    for (std::ptrdiff_t i = 0; i < count; ++i)
      for (int p = 0; p < n; ++p) dest(p, i) = samples[i * step + place[p]];
  });
}

}
