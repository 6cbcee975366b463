#include "scale/pairs.h"

#include <cstring>

#include "image/formats.h"

namespace zor {
namespace {

/// A pair with its two forms. In `Source` a digit is a plane of the source's group; in `Temp` it is the
/// channel that a byte of a temporary pixel holds, and - one that is 0; in `Dest` it is the byte that a plane
/// of dest's group gets.
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
    {Family::Gray, Family::RGB, false, {"0", "-0--", "111"}, {"01", "-0-1", "1113"}},
    {Family::Gray, Family::CMYK, false, {"0", "0000", "0123"}, {"01", "00001", "01234"}},
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

ScalePair Filled(const PairRow& row, const PictureData& source, const PictureData& dest) {
  const bool alpha = source.HasAlpha && dest.HasAlpha;
  const Form& form = alpha ? row.WithAlpha : row.Plain;
  ScalePair pair;
  const PlaneList planes = PlanesOf(GroupFor(row.From, alpha), source);
  pair.Source = {int(std::strlen(form.Source)), planes.Step, {}};
  for (int i = 0; i < pair.Source.Count; ++i) pair.Source.Offset[i] = planes.Offset[form.Source[i] - '0'];
  pair.Luma = row.Luma;
  pair.Channels = row.Luma ? pair.Source.Count - 2 : pair.Source.Count;
  pair.TempBytes = int(std::strlen(form.Temp));
  pair.TempFormat = ScalingFormat[pair.TempBytes];
  for (int i = 0; i < pair.TempBytes; ++i)
    pair.ChannelOfByte[i] = form.Temp[i] == '-' ? ScalePair::Zero : form.Temp[i] - '0';
  pair.Dest = PlanesOf(GroupFor(row.Into, alpha), dest);
  for (int i = 0; i < pair.Dest.Count; ++i) pair.ByteOfPlane[i] = form.Dest[i] - '0';
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

}
