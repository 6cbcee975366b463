#pragma once
#include <span>

#include "image/groups.h"

namespace zor {

constexpr int ColoursOf(Family family) { return family == Family::CMYK ? 4 : family == Family::RGB ? 3 : 1; }

template <int N>
struct Colour {
  Sample Of[N];
};

// What a colour becomes in another family.
template <int N>
constexpr Colour<N> Same(Colour<N> c) {
  return c;
}
constexpr Colour<3> GrayToAll(Colour<1> g) { return {g.Of[0], g.Of[0], g.Of[0]}; }
constexpr Colour<4> GrayToBlack(Colour<1> g) { return {0, 0, 0, g.Of[0]}; }
constexpr Colour<4> GrayToPlates(Colour<1> g) { return {g.Of[0], g.Of[0], g.Of[0], g.Of[0]}; }
constexpr Colour<1> BlackToGray(Colour<4> c) { return {c.Of[3]}; }
/// The weights add up to 256, so white stays 255.
constexpr Colour<1> Luma(Colour<3> c) { return {Sample((c.Of[0] * 77 + c.Of[1] * 151 + c.Of[2] * 28) >> 8)}; }

/// What happens to alpha where both sides have it.
enum class AlphaRule : std::uint8_t { None, Copy, Invert };

using RowConverter = void (*)(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                              std::int32_t width);

/// The way from one family to another, by the rule for alpha.
struct FamilyPair {
  Family From, Into;
  RowConverter By[3];
};

template <int I, int O, Colour<O> (*Step)(Colour<I>), AlphaRule Rule>
void ConvertRow(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                std::int32_t width) {
  constexpr int alpha = Rule == AlphaRule::None ? 0 : 1;
  const PlaneRow<I + alpha> source(const_cast<Sample*>(from), in);
  const PlaneRow<O + alpha> dest(into, out);
  for (std::ptrdiff_t x = 0; x < width; ++x) {
    Colour<I> colour;
    for (int i = 0; i < I; ++i) colour.Of[i] = source(i, x);
    const Colour<O> result = Step(colour);
    for (int o = 0; o < O; ++o) dest(o, x) = result.Of[o];
    if constexpr (Rule == AlphaRule::Copy) dest(O, x) = source(I, x);
    if constexpr (Rule == AlphaRule::Invert) dest(O, x) = Sample(255 - source(I, x));
  }
}

/// A row of a table of pairs. A step that doesn't fit the two families doesn't compile.
template <Family From, Family Into, Colour<ColoursOf(Into)> (*Step)(Colour<ColoursOf(From)>)>
constexpr FamilyPair Pair{From,
                          Into,
                          {ConvertRow<ColoursOf(From), ColoursOf(Into), Step, AlphaRule::None>,
                           ConvertRow<ColoursOf(From), ColoursOf(Into), Step, AlphaRule::Copy>,
                           ConvertRow<ColoursOf(From), ColoursOf(Into), Step, AlphaRule::Invert>}};

/// The loop for the pair in hand; null when the table has no way from source to dest. Without alpha on both
/// sides the dest's alpha is left alone; with it, it is copied or inverted.
inline RowConverter Find(std::span<const FamilyPair> pairs, const PictureData& source,
                         const PictureData& dest, bool invertAlpha = false) {
  const AlphaRule rule = !source.HasAlpha || !dest.HasAlpha ? AlphaRule::None
                         : invertAlpha                      ? AlphaRule::Invert
                                                            : AlphaRule::Copy;
  for (const FamilyPair& pair : pairs)
    if (pair.From == FamilyOf(source) && pair.Into == FamilyOf(dest)) return pair.By[int(rule)];
  return nullptr;
}

}
