#include "image/conversion.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstring>

#include "image/byte_blocks.h"
#include "image/targets.h"

namespace zor {
namespace {

bool InOnePixel(const PlaneList& planes, int count) {
  const std::int32_t left = LeftOf(planes);
  return std::all_of(planes.Offset.begin(), planes.Offset.begin() + count,
                     [&](std::int32_t offset) { return offset >= left && offset - left < planes.Step; });
}

/// The bytes that this processor shuffles at once; with plain instructions, those of a pixel.
std::int32_t BytesOfShuffle() {
  if (!ShufflesBytes()) return ByteShuffle::Least;
  return CurrentTarget == Target::AVX512VBMI ? ByteShuffle::Most : 16;
}

/// Makes the shuffle of a step that only moves samples.
void FillIn(ByteShuffle& shuffle, const StepKind& step, int colours, AlphaRule rule, const PlaneList& in,
            const PlaneList& out) {
  const int written = colours + (rule != AlphaRule::None);
  const std::int32_t size = BytesOfShuffle(), inStep = in.Step, outStep = out.Step,
                     pixels = size / std::max(inStep, outStep), inLeft = LeftOf(in), outLeft = LeftOf(out);
  shuffle.Size = size;
  shuffle.Whole = written == outStep;
  shuffle.Full = pixels * outStep == size;
  shuffle.Pixels = pixels;
  std::array<Sample, 8> order, flip{}, write{};
  order.fill(128);
  for (int o = 0; o < written; ++o) {
    const auto at = std::size_t(out.Offset[std::size_t(o)] - outLeft);
    // Alpha stands behind the colours on either side.
    const int i = o < colours ? step.From[o] : in.Count - 1;
    write[at] = 255;
    if (i != StepKind::Zero) order[at] = Sample(in.Offset[std::size_t(i)] - inLeft);
    if (o == colours && rule == AlphaRule::Invert) flip[at] = 255;
  }
  // Eight bytes at a time, each time over those behind the pixel before. Every byte of the order grows by the
  // same, and none overflows.
  for (std::int32_t x = 0; x < pixels; ++x) {
    const auto pixel = std::uint64_t(x * inStep) * 0x0101010101010101 + std::bit_cast<std::uint64_t>(order);
    std::memcpy(shuffle.From + x * outStep, &pixel, 8);
    std::memcpy(shuffle.Flip + x * outStep, flip.data(), 8);
    std::memcpy(shuffle.Write + x * outStep, write.data(), 8);
  }
}

/// Fetches the start of the row that follows in memory, if rows are long. Where they are asked for one by
/// one, all of a row has been read by then and nothing of the next is on its way.
void FetchNext(const Sample* row, std::uintptr_t bytes) {
  constexpr std::uintptr_t page = 4096;
  if (bytes < page) return;
  const std::uintptr_t next = reinterpret_cast<std::uintptr_t>(row) + bytes;
  for (std::uintptr_t at = next; at < next + page; at += 64)
    __builtin_prefetch(reinterpret_cast<const void*>(at));
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
  IsCopy = pair.From == pair.Into && rule != AlphaRule::Invert && FillPixelsAlike(In, Out);
  FillIn(Shuffle, pair.Step, ColoursOf(pair.Into), rule, In, Out);
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
  if (IsLuma)
    return (ShufflesBytes() ? LumaRow : LumaOfQuads)(
        from, In.Step, {In.Offset[0] - left, In.Offset[1] - left, In.Offset[2] - left}, into, width);
  if (Shuffle.Pixels == 0) return 0;
  const bool whole = Shuffle.Whole || rest == Rest::IsZero;
  if (Shuffle.Size == ByteShuffle::Most) {
    ShuffleWide(Shuffle, from, In.Step, into, Out.Step, width, whole);
    if (rest == Rest::IsZero) FetchNext(from, std::uintptr_t(width) * std::uintptr_t(In.Step));
    return width;
  }
  if (Shuffle.Size == ByteShuffle::Least)
    return ShuffleQuads(Shuffle, from, In.Step, into, Out.Step, width, whole);
  if (whole) return ShuffleRow(Shuffle, from, In.Step, into, Out.Step, width);
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
