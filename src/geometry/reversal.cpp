#include "geometry/reversal.h"

#include <algorithm>
#include <utility>

#include "image/byte_blocks.h"

// A block of 16 bytes holds some whole pixels and at most a part of one more, so it is read so that the part
// lies on the side that the rows go on at: the pixels stand at the low end of a block of the left side, at
// the high end on the right. What isn't to change, filler bytes and the part, is put back as it was.

namespace zor {
namespace {

template <int Step>
constexpr int PixelsInBlock = int(BlockBytes) / Step;
template <int Step>
constexpr int Rest = int(BlockBytes) - PixelsInBlock<Step>* Step;

/// Where byte j comes from when the pixels at one end of a block go to its other end, the last one first.
template <int Step>
constexpr int ToLow(int j) {
  const int pixel = PixelsInBlock<Step> - 1 - j / Step;
  return pixel < 0 ? 0 : Rest<Step> + pixel * Step + j % Step;
}
template <int Step>
constexpr int ToHigh(int j) {
  return j < Rest<Step> ? 0 : ToLow<Step>(j - Rest<Step>) - Rest<Step>;
}

/// How the bytes of a block change places: all at once, or by the halves of ever larger lanes where a
/// processor can't do that.
enum class By { Bytes, Lanes };

using Words = std::uint16_t __attribute__((vector_size(16)));
constexpr int ReversedQuad(int j) { return 3 - j; }

/// The pixels of a block of the right side as they stand on the left, at its low end.
template <int Step, By Way>
Block FromRight(Block block) {
  if constexpr (Way == By::Bytes) return Shuffled<ToLow<Step>>(block, block);
  static_assert(Way == By::Bytes || Rest<Step> == 0);
  if constexpr (Step == 1) block = Block(Words(block) >> 8 | Words(block) << 8);
  if constexpr (Step <= 2) block = Block(Quads(block) >> 16 | Quads(block) << 16);
  return Block(Shuffled<ReversedQuad>(Quads(block), Quads(block)));
}
/// The other way, at the high end.
template <int Step, By Way>
Block FromLeft(Block block) {
  if constexpr (Way == By::Bytes) return Shuffled<ToHigh<Step>>(block, block);
  return FromRight<Step, Way>(block);
}

constexpr Block Blend(Block changed, Block old, Block mask) { return (changed & mask) | (old & ~mask); }

template <int Step, By Way>
void SwapBlocks(Sample* left, Sample* rightEnd, std::ptrdiff_t blocks, const Sample* fromLow,
                const Sample* fromHigh, std::ptrdiff_t toNext) {
  constexpr std::ptrdiff_t blocksInLine = CacheLine / BlockBytes;
  const Block lowMask = LoadBlock(fromLow), highMask = LoadBlock(fromHigh);
  if (blocks <= 0) return;
  Block low = LoadBlock(left), high = LoadBlock(rightEnd - BlockBytes);
  for (;; --blocks) {
    if (toNext != 0 && blocks % blocksInLine == 0) {
      Prefetch(left, toNext);
      Prefetch(rightEnd, toNext);
    }
    const Block nowLow = low, nowHigh = high;
    Sample *intoLeft = left, *intoRight = rightEnd - BlockBytes;
    left += PixelsInBlock<Step> * Step;
    rightEnd -= PixelsInBlock<Step> * Step;
    // Read before this one is written: they may share a byte, which is put back as it was, and a load that
    // overlaps a store in flight waits for it.
    if (blocks > 1) {
      low = LoadBlock(left);
      high = LoadBlock(rightEnd - BlockBytes);
    }
    StoreBlock(intoLeft, Blend(FromRight<Step, Way>(nowHigh), nowLow, lowMask));
    StoreBlock(intoRight, Blend(FromLeft<Step, Way>(nowLow), nowHigh, highMask));
    if (blocks == 1) return;
  }
}

template <int Step, By Way>
void CopyBlocks(const Sample* fromEnd, Sample* into, std::ptrdiff_t blocks, const Sample* fromLow) {
  constexpr int bytes = PixelsInBlock<Step> * Step;
  const Block mask = LoadBlock(fromLow);
  if (blocks <= 0) return;
  Block old = LoadBlock(into);
  for (;; --blocks) {
    const Block pixels = LoadBlock(fromEnd - BlockBytes), now = old;
    // Read before this one is written, as above.
    if (blocks > 1) old = LoadBlock(into + bytes);
    StoreBlock(into, Blend(FromRight<Step, Way>(pixels), now, mask));
    if (blocks == 1) return;
    into += bytes;
    fromEnd -= bytes;
  }
}

/// How many blocks can be taken while each finds 16 bytes of pixels that are still to go.
template <int Step>
std::ptrdiff_t BlocksIn(std::ptrdiff_t pixels) {
  const std::ptrdiff_t bytes = pixels * Step, taken = PixelsInBlock<Step> * Step;
  return bytes < BlockBytes ? 0 : (bytes - BlockBytes) / taken + 1;
}

template <int Step, class Work>
void ByBytesOrLanes(Work work) {
  if constexpr (Rest<Step> == 0)
    if (!ShufflesBytes()) return work.template operator()<By::Lanes>();
  work.template operator()<By::Bytes>();
}

}

Reversal::Reversal(const PlaneList& in, const PlaneList& out, bool inOrder)
    : In(in), Out(out), Edge(in.Offset[0] / in.Step * in.Step) {
  InBlocks =
      !inOrder && in.Step == out.Step && in.Step <= 5 && (ShufflesBytes() || BlockBytes % in.Step == 0);
  std::fill_n(FromLow, BlockBytes, Sample{0});
  std::fill_n(FromHigh, BlockBytes, Sample{0});
  const std::ptrdiff_t rest = BlockBytes % in.Step;
  for (int c = 0; c < in.Count && InBlocks; ++c) {
    const std::ptrdiff_t at = in.Offset[c] - Edge;
    InBlocks = at >= 0 && at < in.Step && in.Offset[c] == out.Offset[c];
    for (std::ptrdiff_t j = at; j < BlockBytes - rest && InBlocks; j += in.Step)
      FromLow[j] = FromHigh[rest + j] = 255;
  }
}

void Reversal::Swap(Sample* a, Sample* b, std::ptrdiff_t count, std::ptrdiff_t toNext) const {
  std::ptrdiff_t done = 0;
  const auto swapBlocks = [&]<int Step>() {
    const std::ptrdiff_t blocks = BlocksIn<Step>(count);
    ByBytesOrLanes<Step>([&]<By Way>() {
      OnBestTarget<SwapBlocks<Step, Way>>(a + Edge, b + Edge + count * Step, blocks, FromLow, FromHigh,
                                          toNext);
    });
    done = blocks * PixelsInBlock<Step>;
  };
  if (InBlocks) ForPlaneCount(In.Step, [&](auto step) { swapBlocks.template operator()<step>(); });
  ForPlaneCount(In.Count, [&](auto n) {
    const PlaneRow<n> left(a, In), right(b, In);
    for (std::ptrdiff_t x = done; x < count; ++x)
      for (int c = 0; c < n; ++c) std::swap(left(c, x), right(c, count - 1 - x));
  });
}

void Reversal::Copy(Sample* from, Sample* into, std::ptrdiff_t count) const {
  std::ptrdiff_t done = 0;
  const auto copyBlocks = [&]<int Step>() {
    const std::ptrdiff_t blocks = BlocksIn<Step>(count);
    const Sample* end = from + Edge + count * Step;
    ByBytesOrLanes<Step>(
        [&]<By Way>() { OnBestTarget<CopyBlocks<Step, Way>>(end, into + Edge, blocks, FromLow); });
    done = blocks * PixelsInBlock<Step>;
  };
  if (InBlocks) ForPlaneCount(In.Step, [&](auto step) { copyBlocks.template operator()<step>(); });
  ForPlaneCount(In.Count, [&](auto n) {
    const PlaneRow<n> in(from, In), out(into, Out);
    for (std::ptrdiff_t x = done; x < count; ++x)
      for (int c = 0; c < n; ++c) out(c, x) = in(c, count - 1 - x);
  });
}

}
