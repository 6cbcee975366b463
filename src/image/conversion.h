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

/// Converts a row, pixel by pixel from left to right.
using RowConverter = void (*)(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                              std::int32_t width);

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

/// What a step does, as far as a faster form can make use of it.
struct StepKind {
  enum { Any, Moves, Luma } Is = Any;
  /// Of a step that only moves samples: for each place of the result the place that its sample comes from, or
  /// Zero.
  static constexpr signed char Zero = -1;
  signed char From[4] = {Zero, Zero, Zero, Zero};
};

/// Tells a step that only moves samples from others by what becomes of each full sample alone: it is full or
/// 0 at every place, and each place is filled by one at most.
template <int I, int O, Colour<O> (*Step)(Colour<I>)>
constexpr StepKind KindOf() {
  if constexpr (I == 3 && O == 1)
    if (Step == Luma) return {StepKind::Luma};
  StepKind moves{StepKind::Moves};
  for (int i = 0; i < I; ++i) {
    Colour<I> pure{};
    pure.Of[i] = 255;
    const Colour<O> result = Step(pure);
    for (int o = 0; o < O; ++o) {
      if (result.Of[o] == 0) continue;
      if (result.Of[o] != 255 || moves.From[o] != StepKind::Zero) return {};
      moves.From[o] = static_cast<signed char>(i);
    }
  }
  return moves;
}

/// The way from one family to another, by the rule for alpha.
struct FamilyPair {
  Family From, Into;
  RowConverter By[3];
  StepKind Step;
};

/// A row of a table of pairs. A step that doesn't fit the two families doesn't compile.
template <Family From, Family Into, Colour<ColoursOf(Into)> (*Step)(Colour<ColoursOf(From)>)>
constexpr FamilyPair Pair{From,
                          Into,
                          {ConvertRow<ColoursOf(From), ColoursOf(Into), Step, AlphaRule::None>,
                           ConvertRow<ColoursOf(From), ColoursOf(Into), Step, AlphaRule::Copy>,
                           ConvertRow<ColoursOf(From), ColoursOf(Into), Step, AlphaRule::Invert>},
                          KindOf<ColoursOf(From), ColoursOf(Into), Step>()};

/// A run of pixels whose samples are moved as a shuffle of a register's bytes: byte b of the result is byte
/// From[b], 0 where From[b] is 128 or more, each bit turned that is set in Flip[b].
struct ByteShuffle {
  static constexpr std::int32_t Most = 64, Least = 4;

  /// Bytes and pixels of one shuffle; no pixels where there is none for these planes or this processor.
  std::int32_t Size = 0, Pixels = 0;
  /// Whether the result's pixels are written whole, and whether they fill the register.
  bool Whole = false, Full = false;
  alignas(Most) Sample From[Most + 8]{};
  alignas(Most) Sample Flip[Most + 8]{};
  /// 255 for the bytes that get a sample.
  alignas(Most) Sample Write[Most + 8]{};
};

/// Rows of one layout into rows of another: the plain loop of a pair, and faster forms of it where the
/// processor and the planes allow.
class RowConversion {
 public:
  /// No way.
  RowConversion() = default;
  /// The planes are the families' colours in their order; then alpha, unless the rule is None.
  RowConversion(const FamilyPair& pair, AlphaRule rule, const PlaneList& in, const PlaneList& out);

  explicit operator bool() const { return Plain != nullptr; }
  /// Whether whole pixels are copied as they are.
  bool Copies() const { return IsCopy; }
  /// Converts `width` pixels. Rows may overlap: the result is that of going pixel by pixel from left to
  /// right.
  void operator()(const Sample* from, Sample* into, std::int32_t width) const {
    Run(from, into, width, Rest::Stays);
  }
  /// The same into memory that holds nothing: bytes that aren't written otherwise become 0.
  void IntoNew(const Sample* from, Sample* into, std::int32_t width) const {
    Run(from, into, width, Rest::IsZero);
  }

 private:
  /// What becomes of the bytes of a pixel that the step doesn't write.
  enum class Rest { Stays, IsZero };

  void Run(const Sample* from, Sample* into, std::int32_t width, Rest rest) const;
  bool Apart(const Sample* from, const Sample* into, std::int32_t width) const;
  std::int32_t FastPart(const Sample* from, Sample* into, std::int32_t width, Rest rest) const;

  RowConverter Plain = nullptr;
  PlaneList In, Out;
  bool IsCopy = false, IsLuma = false;
  ByteShuffle Shuffle;
};

/// The way between families in a table; empty when it has none.
RowConversion Find(std::span<const FamilyPair> pairs, Family from, const PlaneList& in, Family into,
                   const PlaneList& out, AlphaRule rule);
/// The same between two pictures. Without alpha on both sides the dest's alpha is left alone; with it, it is
/// copied or inverted.
RowConversion Find(std::span<const FamilyPair> pairs, const PictureData& source, const PictureData& dest,
                   bool invertAlpha = false);

// The faster forms, of rows that don't overlap. None touches a byte beyond the row; where one gives a number,
// that is how many pixels from the left it has done.

/// How many pixels, from the left, may be the first of a run of `bytes` bytes.
constexpr std::int32_t Starts(std::int32_t width, std::int32_t step, std::int32_t bytes) {
  return width - (bytes + step - 1) / step + 1;
}

/// For a shuffle of 64 bytes. With `whole` the bytes that get no sample become 0, else they keep their
/// values.
void ShuffleWide(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                 std::int32_t intoStep, std::int32_t width, bool whole);
/// For one of 16. Writes whole pixels; the bytes that get no sample become 0.
std::int32_t ShuffleRow(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                        std::int32_t intoStep, std::int32_t width);
/// The other bytes keep their values. For a shuffle that is full: what is kept would otherwise be read behind
/// the store before it, which stalls.
std::int32_t ShuffleInto(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                         std::int32_t intoStep, std::int32_t width);
/// For one of 4, a pixel, without shuffles; none is done where its bytes aren't those of the source turned,
/// or turned and the other way round. With `whole` as for 64 bytes.
std::int32_t ShuffleQuads(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                          std::int32_t intoStep, std::int32_t width, bool whole);
/// From the left edges of pixels of 3 or 4 bytes, with the planes' places in them, into packed gray.
std::int32_t LumaRow(const Sample* from, std::int32_t step, const std::int32_t (&places)[3], Sample* into,
                     std::int32_t width);
/// The same without shuffles.
std::int32_t LumaOfQuads(const Sample* from, std::int32_t step, const std::int32_t (&places)[3], Sample* into,
                         std::int32_t width);

}
