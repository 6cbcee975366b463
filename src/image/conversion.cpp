#include "image/conversion.h"

#include <algorithm>
#include <cstring>

#include "image/targets.h"

namespace zor {
namespace {

bool InOnePixel(const PlaneList& planes, int count) {
  const std::int32_t left = LeftOf(planes);
  return std::all_of(planes.Offset.begin(), planes.Offset.begin() + count,
                     [&](std::int32_t offset) { return offset >= left && offset - left < planes.Step; });
}

/// The shuffle of a step that only moves samples; one of 0 pixels where the planes don't allow it.
ByteShuffle ShuffleOf(const StepKind& step, int colours, AlphaRule rule, const PlaneList& in,
                      const PlaneList& out) {
  ByteShuffle shuffle;
  const int written = colours + (rule != AlphaRule::None);
  const std::int32_t pixels = 16 / std::max(in.Step, out.Step), inLeft = LeftOf(in), outLeft = LeftOf(out);
  shuffle.Whole = written == out.Step;
  shuffle.Full = pixels * out.Step == 16;
  std::fill_n(shuffle.From, 16, Sample(128));
  for (std::int32_t x = 0; x < pixels; ++x)
    for (int o = 0; o < written; ++o) {
      const auto at = std::size_t(x * out.Step + out.Offset[std::size_t(o)] - outLeft);
      // Alpha stands behind the colours on either side.
      const int i = o < colours ? step.From[o] : in.Count - 1;
      shuffle.Write[at] = 255;
      if (i != StepKind::Zero) shuffle.From[at] = Sample(x * in.Step + in.Offset[std::size_t(i)] - inLeft);
      if (o == colours && rule == AlphaRule::Invert) shuffle.Flip[at] = 255;
    }
  shuffle.Pixels = pixels;
  return shuffle;
}

}

RowConversion::RowConversion(const FamilyPair& pair, AlphaRule rule, const PlaneList& in,
                             const PlaneList& out)
    : Plain(pair.By[int(rule)]), In(in), Out(out) {
  const int alpha = rule != AlphaRule::None;
  In.Count = ColoursOf(pair.From) + alpha;
  Out.Count = ColoursOf(pair.Into) + alpha;
  if (!InOnePixel(In, In.Count) || !InOnePixel(Out, Out.Count)) return;
  IsLuma = pair.Step.Is == StepKind::Luma && rule == AlphaRule::None && Out.Step == 1 && In.Step <= 4;
  if (pair.Step.Is != StepKind::Moves) return;
  IsCopy = pair.From == pair.Into && rule != AlphaRule::Invert && SamePixels(In, Out);
  Shuffle = ShuffleOf(pair.Step, ColoursOf(pair.Into), rule, In, Out);
}

bool RowConversion::Apart(const Sample* from, const Sample* into, std::int32_t width) const {
  const auto source = reinterpret_cast<std::uintptr_t>(from + LeftOf(In)),
             dest = reinterpret_cast<std::uintptr_t>(into + LeftOf(Out));
  return source + std::uintptr_t(width) * std::uintptr_t(In.Step) <= dest ||
         dest + std::uintptr_t(width) * std::uintptr_t(Out.Step) <= source;
}

std::int32_t RowConversion::FastPart(const Sample* from, Sample* into, std::int32_t width, Rest rest) const {
  const std::int32_t left = LeftOf(In);
  from += left;
  into += LeftOf(Out);
  if (IsCopy) {
    std::memcpy(into, from, std::size_t(width) * std::size_t(In.Step));
    return width;
  }
  if (CurrentTarget == Target::Plain) return 0;
  if (IsLuma)
    return LumaRow(from, In.Step, {In.Offset[0] - left, In.Offset[1] - left, In.Offset[2] - left}, into,
                   width);
  if (Shuffle.Pixels == 0) return 0;
  if (Shuffle.Whole || rest == Rest::IsZero) return ShuffleRow(Shuffle, from, In.Step, into, Out.Step, width);
  return Shuffle.Full ? ShuffleInto(Shuffle, from, In.Step, into, Out.Step, width) : 0;
}

void RowConversion::Run(const Sample* from, Sample* into, std::int32_t width, Rest rest) const {
  const std::int32_t done = Apart(from, into, width) ? FastPart(from, into, width, rest) : 0;
  if (done >= width) return;
  from += std::ptrdiff_t(done) * In.Step;
  into += std::ptrdiff_t(done) * Out.Step;
  if (rest == Rest::IsZero)
    std::memset(into + LeftOf(Out), 0, std::size_t(width - done) * std::size_t(Out.Step));
  Plain(from, In, into, Out, width - done);
}

RowConversion Find(std::span<const FamilyPair> pairs, Family from, const PlaneList& in, Family into,
                   const PlaneList& out, AlphaRule rule) {
  for (const FamilyPair& pair : pairs)
    if (pair.From == from && pair.Into == into) return {pair, rule, in, out};
  return {};
}

RowConversion Find(std::span<const FamilyPair> pairs, const PictureData& source, const PictureData& dest,
                   bool invertAlpha) {
  const AlphaRule rule = !source.HasAlpha || !dest.HasAlpha ? AlphaRule::None
                         : invertAlpha                      ? AlphaRule::Invert
                                                            : AlphaRule::Copy;
  return Find(pairs, FamilyOf(source), PlanesOf(GroupOf(source), source), FamilyOf(dest),
              PlanesOf(GroupOf(dest), dest), rule);
}

}
