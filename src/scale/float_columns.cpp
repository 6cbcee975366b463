#include "scale/float_columns.h"

#include <algorithm>

#include "image/targets.h"
#include "scale/exact_passes.h"
#include "scale/quotients.h"

namespace zor {
namespace {

// A line is made in blocks of four vectors of 16 lanes, whatever the instruction set.
constexpr int Lanes = 16, Block = 4 * Lanes;
using Floats [[gnu::vector_size(Lanes * 4)]] = float;
using Integers [[gnu::vector_size(Lanes * 4)]] = std::int32_t;
using Bytes [[gnu::vector_size(Lanes)]] = Sample;
using BlockOfBytes [[gnu::vector_size(Block)]] = Sample;

/// Bytes of the widened rows: they stay in the second-level cache.
constexpr std::size_t CacheRoom = 384 << 10;

template <class Vector>
Vector& At(void* address) {
  return *static_cast<Vector*>(address);
}

/// What becomes of sums: cut off and clamped.
inline void StoreBytes(const Floats& sums, Sample* into) {
  Integers whole = __builtin_convertvector(sums, Integers);
  whole = whole < 0 ? 0 : whole;
  whole = whole > 255 ? 255 : whole;
  const Bytes bytes = __builtin_convertvector(whole, Bytes);
  std::memcpy(into, &bytes, sizeof bytes);
}

struct Sums {
  const float* const* Rows;
  const float* Shares;
  std::int32_t Count;
  FloatLine Line;
  std::ptrdiff_t Samples;
  /// The bytes of the sums, and of the sums plus the gap.
  Sample *Lower, *Upper;
};

void SumRows(const Sums* sums) {
  for (std::ptrdiff_t i = 0; i < sums->Samples; i += Block) {
    Floats sum[4];
    for (int k = 0; k < 4; ++k) sum[k] = Floats{} + sums->Line.Start;
    for (std::int32_t t = 0; t < sums->Count; ++t) {
      const float share = sums->Shares[t];
      const auto* row = reinterpret_cast<const Floats*>(sums->Rows[t] + i);
      for (int k = 0; k < 4; ++k) sum[k] += share * row[k];
    }
    for (int k = 0; k < 4; ++k) StoreBytes(sum[k], sums->Lower + i + k * Lanes);
    if (sums->Line.Gap == 0.0F) continue;
    for (int k = 0; k < 4; ++k) StoreBytes(sum[k] + sums->Line.Gap, sums->Upper + i + k * Lanes);
  }
}

void Widen(const Sample* from, std::ptrdiff_t count, float* into) {
  for (std::ptrdiff_t i = 0; i < count; ++i) into[i] = float(from[i]);
}

/// Takes the bytes of `order` out of each temporary pixel of four bytes. Reads and writes whole blocks.
void Pack(const Sample* from, std::ptrdiff_t pixels, const SampleOrder* order, Sample* into) {
  BlockOfBytes index = {};
  for (int p = 0; p < Block / 4; ++p)
    for (int k = 0; k < order->Count; ++k) index[p * order->Count + k] = Sample(p * 4 + order->Byte[k]);
  for (std::ptrdiff_t x = 0; x < pixels; x += Block / 4) {
    BlockOfBytes block;
    std::memcpy(&block, from + x * 4, sizeof block);
    block = __builtin_shuffle(block, index);
    std::memcpy(into + x * order->Count, &block, sizeof block);
  }
}

/// A target with a byte permutation of a whole block packs pixels in passing; others widen them as they are.
bool PacksWell(int tempBytes) { return CurrentTarget == Target::AVX512VBMI && tempBytes == 4; }

SampleOrder OrderOf(const ScalePair& pair) {
  SampleOrder order;
  // The planes by their place in the pixel.
  std::array<int, 5> planes{};
  for (int p = 0; p < pair.Dest.Count; ++p) {
    int place = 0;
    for (int other = 0; other < pair.Dest.Count; ++other)
      if (pair.Dest.Offset[other] < pair.Dest.Offset[p]) ++place;
    planes[place] = p;
  }
  if (!PacksWell(pair.TempBytes)) {
    order.Count = pair.TempBytes;
    for (int b = 0; b < pair.TempBytes; ++b) order.Byte[b] = b;
    order.OfPlane = pair.ByteOfPlane;
    order.Direct = pair.TempBytes == pair.Dest.Count;
    for (int p = 0; p < pair.Dest.Count; ++p) order.Direct &= pair.ByteOfPlane[planes[p]] == p;
  } else {
    for (int place = 0; place < pair.Dest.Count; ++place) {
      const int plane = planes[place];
      const auto known =
          std::find(order.Byte.begin(), order.Byte.begin() + order.Count, pair.ByteOfPlane[plane]);
      order.OfPlane[plane] = int(known - order.Byte.begin());
      if (known == order.Byte.begin() + order.Count) order.Byte[order.Count++] = pair.ByteOfPlane[plane];
    }
    order.Direct = order.Count == pair.Dest.Count;
  }
  order.Direct &= pair.Dest.Count == pair.Dest.Step;
  return order;
}

std::ptrdiff_t RoundedUp(std::ptrdiff_t count) { return (count + Block - 1) / Block * Block; }

}

FloatColumns::FloatColumns(PictureData& temp, const ScalePair& pair, const ContributionTable& table)
    : Temp(temp), TempBytes(pair.TempBytes), Samples(OrderOf(pair)) {
  std::int32_t longest = 1;
  for (std::int32_t y = 0; y < table.Count(); ++y)
    if (const Contribution& line = table[y]; line.Count > 0) {
      longest = std::max(longest, line.Count);
      Slots = std::max(Slots, line.Entries[line.Count - 1].Pixel - line.Entries[0].Pixel + 1);
    }
  Slots = std::max(Slots, 1);
  const std::size_t room = CacheRoom / sizeof(float) / std::size_t(Slots);
  if (room < 4 * Block) return;
  Stripe = std::int32_t(room) / Samples.Count / Block * Block;
  Room = RoundedUp(std::ptrdiff_t{Stripe} * Samples.Count) + Block;
  // One allocation, its parts aligned like vectors.
  const std::size_t rows = std::size_t(Room) * sizeof(float) * std::size_t(Slots);
  const std::size_t bytes = std::size_t(Stripe) * 5 + 2 * Block;
  Memory = NewBuffer(rows + 3 * bytes + Block);
  ShareMemory = NewBuffer(std::size_t(longest) * (sizeof(float*) + sizeof(float)) +
                          std::size_t(Slots) * sizeof(std::int32_t));
  if (!ShareMemory) Memory.reset();
  if (!Memory) return;
  const auto address = reinterpret_cast<Word>(Memory.get());
  Sample* aligned = Memory.get() + (Block - address % Block) % Block;
  Rows = &At<float>(aligned);
  Packed = aligned + rows;
  Lower = Packed + bytes;
  Upper = Lower + bytes;
  RowsOfLine = &At<const float*>(ShareMemory.get());
  Shares = &At<float>(RowsOfLine + longest);
  RowOfSlot = &At<std::int32_t>(Shares + longest);
}

void FloatColumns::Begin(std::int32_t firstPixel, std::int32_t pixels) {
  FirstPixel = firstPixel;
  Pixels = pixels;
  std::fill_n(RowOfSlot, Slots, -1);
}

const float* FloatColumns::Widened(std::int32_t row) {
  const std::int32_t slot = row % Slots;
  float* into = Rows + slot * Room;
  if (RowOfSlot[slot] == row) return into;
  RowOfSlot[slot] = row;
  const std::ptrdiff_t bytes = std::ptrdiff_t{Pixels} * TempBytes;
  const bool packs = PacksWell(TempBytes);
  const bool reached = WithRow(Temp, row, [&](const Sample* bytesOfRow) {
    const Sample* from = bytesOfRow + std::ptrdiff_t{FirstPixel} * TempBytes;
    if (!packs) return OnBestTarget<Widen>(from, bytes, into);
    // The last block may end beyond the row.
    const std::ptrdiff_t whole = Pixels / (Block / 4) * (Block / 4);
    OnBestTarget<Pack>(from, whole, &Samples, Packed);
    Sample last[Block] = {};
    std::memcpy(last, from + whole * 4, std::size_t(bytes - whole * 4));
    OnBestTarget<Pack>(&last[0], std::ptrdiff_t{Pixels} - whole, &Samples, Packed + whole * Samples.Count);
    OnBestTarget<Widen>(Packed, std::ptrdiff_t{Pixels} * Samples.Count, into);
  });
  if (!reached) std::fill_n(into, Room, 0.0F);
  return into;
}

const Sample* FloatColumns::Line(const Contribution& line) {
  FloatLine made;
  if (!MakeFloat(line, Shares, made)) return nullptr;
  for (std::int32_t i = 0; i < line.Count; ++i) RowsOfLine[i] = Widened(line.Entries[i].Pixel);
  const Sums sums{RowsOfLine, Shares, line.Count, made, std::ptrdiff_t{Pixels} * Samples.Count, Lower, Upper};
  OnBestTarget<SumRows>(&sums);
  if (made.Gap > 0.0F) Settle(line);
  return Lower;
}

/// Makes the samples in doubt by the plain form. A widened sample is the sample itself.
void FloatColumns::Settle(const Contribution& line) {
  const std::ptrdiff_t count = std::ptrdiff_t{Pixels} * Samples.Count;
  for (std::ptrdiff_t block = 0; block < count; block += Block) {
    if (std::memcmp(Lower + block, Upper + block, Block) == 0) continue;
    for (std::ptrdiff_t i = block; i < std::min(block + Block, count); ++i) {
      if (Lower[i] == Upper[i]) continue;
      double sum = 0.0;
      for (std::int32_t t = 0; t < line.Count; ++t)
        sum += double(line.Entries[t].Weight) * double(RowsOfLine[t][i]);
      Lower[i] = ExactQuotient(sum, line.Sum);
    }
  }
}

}
