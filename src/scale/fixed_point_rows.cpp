#include "scale/fixed_point_rows.h"

#include <algorithm>
#include <bit>
#include <limits>

#include "image/targets.h"
#include "scale/exact_passes.h"
#include "scale/quotients.h"

#if defined(__x86_64__) || defined(__i386__)
// g++ 12 takes the undefined vectors of its own header for mistakes (its bug 105593).
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#pragma GCC diagnostic ignored "-Wuninitialized"
#include <immintrin.h>
#pragma GCC diagnostic pop
#define ZOR_VNNI [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq,avx512vbmi,avx512vnni,bmi2")]]
#define ZOR_HAS_VNNI 1
#else
#define ZOR_HAS_VNNI 0
#endif

namespace zor {
namespace {

constexpr int Lanes = 16, Taps = 4, VectorBytes = 64;

/// Source pixels from the first to the last that a line takes in.
std::int32_t FirstPixel(const Contribution& line) { return line.Entries[0].Pixel; }
std::int32_t Reach(const Contribution& line) {
  return line.Count > 0 ? line.Entries[line.Count - 1].Pixel - line.Entries[0].Pixel + 1 : 0;
}

/// The first multiple of a vector in memory that has room for one more.
Sample* Aligned(const Buffer& memory) {
  const auto address = reinterpret_cast<Word>(memory.get());
  return memory.get() + (VectorBytes - address % VectorBytes) % VectorBytes;
}

/// The part of a share that stands at a digit, so that share = sum of digit * 256^place, each from -128 to
/// 127.
std::int8_t TakeDigit(std::int32_t& share) {
  const auto digit = std::int8_t(share & 255);
  share = (share - digit) / 256;
  return digit;
}

}

/// A few output pixels side by side.
struct alignas(VectorBytes) FixedPointRows::ColumnGroup {
  /// Which of 64 bytes goes where: Taps bytes a lane.
  std::uint8_t Index[VectorBytes];
  std::int32_t Bias[Lanes];
  std::uint32_t Doubtful[Lanes];
  /// Bytes from the row's first sample to the group's, and what each step adds to it.
  std::int64_t Base;
  std::int32_t Steps;
  /// Steps whose 64 bytes all lie in the row.
  std::int32_t WholeSteps;
  std::int32_t FirstColumn;
  std::int32_t Columns;
  /// Lanes of lines that have no fixed-point form.
  std::uint32_t AlwaysDoubtful;
  const std::int8_t* Weights;
};

/// Lays out the groups.
struct GroupMaker {
  FixedPointRows& Rows;
  const ContributionTable& Table = Rows.Table;
  const int Channels = Rows.Pair.Channels;
  const int Step = Rows.Pair.Source.Step;

  std::int32_t ColumnsFrom(std::int32_t x) const { return std::min(Rows.Pixels, Rows.ResultWidth - x); }
  /// The leftmost source pixel of a group, how far right of it a line begins, and the most that one takes in.
  /// A line may begin left of the one before it, since weights of 0 have no entries.
  void Extent(std::int32_t x, std::int32_t& start, std::int32_t& reach, std::int32_t& farthest) const {
    std::int32_t least = std::numeric_limits<std::int32_t>::max(), most = 0;
    reach = 0;
    for (std::int32_t p = x; p < x + ColumnsFrom(x); ++p) {
      const Contribution& line = Table[p];
      if (line.Count == 0) continue;
      least = std::min(least, FirstPixel(line));
      most = std::max(most, FirstPixel(line));
      reach = std::max(reach, Reach(line));
    }
    start = std::min(least, most);
    farthest = most - start;
  }
  std::int32_t StepsFor(std::int32_t reach) const {
    return (reach + Taps * Rows.Parts - 1) / (Taps * Rows.Parts);
  }
  /// How much work a layout is; negative where it isn't one, since a permutation can't reach so far.
  std::int64_t Cost() const {
    std::int64_t cost = 0;
    for (std::int32_t x = 0; x < Rows.ResultWidth; x += Rows.Pixels) {
      std::int32_t start, reach, farthest;
      Extent(x, start, reach, farthest);
      if ((std::int64_t{farthest} + Taps * Rows.Parts - 1) * Step + Rows.Spread >= VectorBytes) return -1;
      cost += 4 * StepsFor(reach) + 10;
    }
    return cost;
  }
  bool ChooseLayout() {
    std::int64_t best = -1;
    int bestPixels = 0, bestParts = 0;
    for (int pixels = Lanes / Channels; pixels >= 1; --pixels)
      for (int parts = Lanes / (Channels * pixels); parts >= 1; --parts) {
        Rows.Pixels = pixels;
        Rows.Parts = parts;
        const std::int64_t cost = Cost();
        if (cost < 0 || (best >= 0 && cost >= best)) continue;
        best = cost;
        bestPixels = pixels;
        bestParts = parts;
      }
    Rows.Pixels = bestPixels;
    Rows.Parts = bestParts;
    return best >= 0;
  }
  int Lane(int part, int pixel, int channel) const {
    return (part * Rows.Pixels + pixel) * Channels + channel;
  }
  void FillIndex(FixedPointRows::ColumnGroup& group, std::int32_t start) const {
    for (int part = 0; part < Rows.Parts; ++part)
      for (std::int32_t p = 0; p < group.Columns; ++p) {
        const Contribution& line = Table[group.FirstColumn + p];
        const std::int32_t first = line.Count > 0 ? FirstPixel(line) - start : 0;
        for (int c = 0; c < Channels; ++c)
          for (int t = 0; t < Taps; ++t)
            group.Index[Lane(part, p, c) * Taps + t] =
                std::uint8_t((first + part * Taps + t) * Step + Rows.Pair.Source.Offset[c] - Rows.Lead);
      }
  }
  /// Fills all of a group but what comes of the shares; gives its steps.
  std::int32_t PlaceGroup(FixedPointRows::ColumnGroup& group, std::int32_t number) const {
    group.FirstColumn = number * Rows.Pixels;
    group.Columns = ColumnsFrom(group.FirstColumn);
    std::int32_t start, reach, farthest;
    Extent(group.FirstColumn, start, reach, farthest);
    group.Base = std::int64_t{start} * Step;
    group.Steps = StepsFor(reach);
    const std::int64_t room = Rows.RowBytes - group.Base - VectorBytes;
    const std::int64_t whole = room < 0 ? 0 : room / (Taps * Rows.Parts * Step) + 1;
    group.WholeSteps = std::int32_t(std::min<std::int64_t>(group.Steps, whole));
    FillIndex(group, start);
    return group.Steps;
  }
  /// Writes the digits of one line's shares into the weights of its group.
  void FillWeights(std::int8_t* weights, int pixel, const Contribution& line,
                   const std::int32_t* shares) const {
    for (std::int32_t i = 0; i < line.Count; ++i) {
      const std::int32_t tap = line.Entries[i].Pixel - FirstPixel(line);
      const std::int32_t step = tap / (Taps * Rows.Parts), within = tap % (Taps * Rows.Parts);
      std::int32_t share = shares[i];
      // The digits that no share of the table has are its lowest ones.
      for (int d = Rows.Digits; d < 3; ++d) TakeDigit(share);
      for (int d = Rows.Digits - 1; d >= 0; --d) {
        const std::int8_t digit = TakeDigit(share);
        for (int c = 0; c < Channels; ++c)
          weights[(std::ptrdiff_t{step} * Rows.Digits + d) * VectorBytes +
                  Lane(within / Taps, pixel, c) * Taps + within % Taps] = digit;
      }
    }
  }
};

#if ZOR_HAS_VNNI

/// Runs the groups over one row or four.
struct GroupRunner {
  /// A lane's sum: its digits put together, the parts of a pixel added up.
  template <int Digits>
  ZOR_VNNI static __m512i Joined(const __m512i* digits) {
    __m512i sum = digits[0];
    if constexpr (Digits > 1) sum = _mm512_add_epi32(_mm512_slli_epi32(sum, 8), digits[1]);
    if constexpr (Digits > 2) sum = _mm512_add_epi32(_mm512_slli_epi32(sum, 8), digits[2]);
    return Digits < 3 ? _mm512_slli_epi32(sum, 8 * (3 - Digits)) : sum;
  }

  ZOR_VNNI static __m512i PartsAdded(__m512i sum, int parts, int lanesOfPart) {
    const __m512i lane = _mm512_set_epi32(15, 14, 13, 12, 11, 10, 9, 8, 7, 6, 5, 4, 3, 2, 1, 0);
    __m512i all = sum;
    for (int part = 1; part < parts; ++part)
      all = _mm512_add_epi32(
          all, _mm512_permutexvar_epi32(_mm512_add_epi32(lane, _mm512_set1_epi32(part * lanesOfPart)), sum));
    return all;
  }

  template <int Rows, int Digits>
  ZOR_VNNI static void Run(const FixedPointRows& plan, const Sample* const* from, Sample* const* into) {
    const ScalePair& pair = plan.Pair;
    const int bytes = pair.TempBytes, lanesOfPart = plan.Pixels * pair.Channels;
    // What becomes of 16 sums: the low byte of the lane that a byte of a temporary pixel shows.
    alignas(VectorBytes) std::uint8_t index[VectorBytes] = {};
    __mmask64 shown = 0;
    for (int p = 0; p < plan.Pixels; ++p)
      for (int b = 0; b < bytes; ++b)
        if (const int channel = pair.ChannelOfByte[b]; channel != ScalePair::Zero) {
          index[p * bytes + b] = std::uint8_t((p * pair.Channels + channel) * 4);
          shown |= __mmask64{1} << (p * bytes + b);
        }
    const __m512i outIndex = _mm512_load_si512(index);
    const __m512i fraction = _mm512_set1_epi32((1 << FixedPointLine::Bits) - 1);
    const __m512i one = _mm512_set1_epi32(1 << FixedPointLine::Bits), zero = _mm512_setzero_si512();
    const __m512i white = _mm512_set1_epi32(255);
    const std::int64_t step = std::int64_t{Taps} * plan.Parts * pair.Source.Step;
    const std::int64_t written = std::int64_t{plan.ResultWidth} * bytes;

    for (std::int32_t g = 0; g < plan.GroupCount; ++g) {
      const FixedPointRows::ColumnGroup& group = plan.Groups[g];
      const __m512i take = _mm512_load_si512(group.Index);
      __m512i sums[Rows][Digits];
      const Sample* source[Rows];
      for (int r = 0; r < Rows; ++r) {
        source[r] = from[r] + plan.Lead + group.Base;
        for (int d = 0; d < Digits; ++d) sums[r][d] = zero;
      }
      const std::int8_t* weights = group.Weights;
      std::int32_t s = 0;
      for (; s < group.WholeSteps; ++s, weights += Digits * VectorBytes) {
        __m512i weight[Digits];
        for (int d = 0; d < Digits; ++d) weight[d] = _mm512_load_si512(weights + d * VectorBytes);
        for (int r = 0; r < Rows; ++r) {
          const __m512i taps = _mm512_permutexvar_epi8(take, _mm512_loadu_si512(source[r] + s * step));
          for (int d = 0; d < Digits; ++d) sums[r][d] = _mm512_dpbusd_epi32(sums[r][d], taps, weight[d]);
        }
      }
      for (; s < group.Steps; ++s, weights += Digits * VectorBytes) {
        const std::int64_t left = std::max<std::int64_t>(plan.RowBytes - group.Base - s * step, 0);
        const __mmask64 inRow = left >= 64 ? ~__mmask64{0} : (__mmask64{1} << left) - 1;
        for (int r = 0; r < Rows; ++r) {
          const __m512i taps =
              _mm512_permutexvar_epi8(take, _mm512_maskz_loadu_epi8(inRow, source[r] + s * step));
          for (int d = 0; d < Digits; ++d)
            sums[r][d] = _mm512_dpbusd_epi32(sums[r][d], taps, _mm512_load_si512(weights + d * VectorBytes));
        }
      }

      const __m512i bias = _mm512_load_si512(group.Bias), doubtful = _mm512_load_si512(group.Doubtful);
      const std::int64_t at = std::int64_t{group.FirstColumn} * bytes;
      const int count = group.Columns * bytes;
      for (int r = 0; r < Rows; ++r) {
        __m512i sum = Joined<Digits>(sums[r]);
        if (plan.Parts > 1) sum = PartsAdded(sum, plan.Parts, lanesOfPart);
        sum = _mm512_add_epi32(sum, bias);
        // Near 0 both sides give the same byte.
        const __mmask16 above = _mm512_cmpge_epi32_mask(sum, _mm512_srli_epi32(one, 1));
        __mmask16 doubt = _mm512_mask_cmplt_epu32_mask(above, _mm512_and_si512(sum, fraction), doubtful);
        __m512i value = _mm512_srai_epi32(sum, FixedPointLine::Bits);
        value = _mm512_min_epi32(_mm512_max_epi32(value, zero), white);
        const __m512i pixels = _mm512_maskz_permutexvar_epi8(shown, outIndex, value);
        Sample* out = into[r] + at;
        if (count <= 32 && at + 32 <= written)
          _mm256_storeu_si256(reinterpret_cast<__m256i*>(out), _mm512_castsi512_si256(pixels));
        else
          _mm512_mask_storeu_epi8(out, (count >= 64 ? 0 : __mmask64{1} << count) - 1, pixels);
        doubt =
            __mmask16(doubt | group.AlwaysDoubtful) & __mmask16((1U << (group.Columns * pair.Channels)) - 1);
        if (doubt) [[unlikely]]
          Settle(plan, group, doubt, from[r], into[r]);
      }
    }
  }

  /// Makes the samples in doubt by the plain form.
  [[gnu::noinline, gnu::cold]] static void Settle(const FixedPointRows& plan,
                                                  const FixedPointRows::ColumnGroup& group,
                                                  std::uint32_t doubt, const Sample* from, Sample* into) {
    const ScalePair& pair = plan.Pair;
    for (; doubt != 0; doubt &= doubt - 1) {
      const int lane = std::countr_zero(doubt), channel = lane % pair.Channels;
      const std::int32_t x = group.FirstColumn + lane / pair.Channels;
      const Contribution& line = plan.Table[x];
      const Sample* plane = from + pair.Source.Offset[channel];
      double sum = 0.0;
      for (std::int32_t i = 0; i < line.Count; ++i)
        sum +=
            double(line.Entries[i].Weight) * plane[std::ptrdiff_t{line.Entries[i].Pixel} * pair.Source.Step];
      const Sample sample = ExactQuotient(sum, line.Sum);
      Sample* pixel = into + std::ptrdiff_t{x} * pair.TempBytes;
      for (int b = 0; b < pair.TempBytes; ++b)
        if (pair.ChannelOfByte[b] == channel) pixel[b] = sample;
    }
  }

  template <int Rows>
  static void RunDigits(const FixedPointRows& plan, const Sample* const* from, Sample* const* into) {
    switch (plan.Digits) {
      case 1: return Run<Rows, 1>(plan, from, into);
      case 2: return Run<Rows, 2>(plan, from, into);
      default: return Run<Rows, 3>(plan, from, into);
    }
  }
};

void FixedPointRows::Run(const Sample* const* from, Sample* const* into, int rows) const {
  if (rows == RowsTogether)
    GroupRunner::RunDigits<RowsTogether>(*this, from, into);
  else
    GroupRunner::RunDigits<1>(*this, from, into);
}

#else

void FixedPointRows::Run(const Sample* const*, Sample* const*, int) const {}

#endif

/// The shares of all lines, in their order.
struct FixedPointRows::Shares {
  Buffer EntryMemory, LineMemory, FitMemory;
  /// Lines without a fixed-point form, whose shares are 0; and all bits that are set in a share.
  std::int32_t Unfit = 0;
  std::uint32_t Used = 0;

  explicit Shares(const ContributionTable& table) {
    std::size_t entries = 0;
    for (std::int32_t x = 0; x < table.Count(); ++x) entries += std::size_t(table[x].Count);
    EntryMemory = NewBuffer((entries + 1) * sizeof(std::int32_t));
    LineMemory = NewBuffer(std::size_t(table.Count()) * sizeof(FixedPointLine));
    FitMemory = NewBuffer(std::size_t(table.Count()));
    if (*this) Fill(table);
  }
  explicit operator bool() const { return EntryMemory && LineMemory && FitMemory; }
  std::int32_t* Entries() const { return reinterpret_cast<std::int32_t*>(EntryMemory.get()); }
  FixedPointLine& Line(std::int32_t x) const {
    return reinterpret_cast<FixedPointLine*>(LineMemory.get())[x];
  }
  bool Fits(std::int32_t x) const { return FitMemory[std::size_t(x)] != 0; }

 private:
  void Fill(const ContributionTable& table) {
    std::int32_t* shares = Entries();
    for (std::int32_t x = 0; x < table.Count(); ++x) {
      const bool fits = MakeFixedPoint(table[x], shares, Line(x));
      FitMemory[std::size_t(x)] = fits;
      if (!fits) std::fill_n(shares, table[x].Count, 0);
      Unfit += fits ? 0 : 1;
      for (std::int32_t i = 0; i < table[x].Count; ++i) Used |= std::uint32_t(shares[i]);
      shares += table[x].Count;
    }
  }
};

FixedPointRows::FixedPointRows(const ScalePair& pair, const ContributionTable& table,
                               std::int32_t sourceWidth)
    : Pair(pair), Table(table), ResultWidth(table.Count()) {
  const auto [least, most] =
      std::minmax_element(Pair.Source.Offset.begin(), Pair.Source.Offset.begin() + Pair.Source.Count);
  Lead = *least;
  Spread = *most - *least;
  RowBytes = (std::int64_t{sourceWidth} - 1) * Pair.Source.Step + Spread + 1;
  Built = ZOR_HAS_VNNI && CurrentTarget == Target::AVX512VBMI && !Pair.Luma && Build();
}

bool FixedPointRows::Build() {
  GroupMaker maker{*this};
  if (!maker.ChooseLayout()) return false;
  // How many digits the shares need decides how the weights lie.
  const Shares shares(Table);
  // Where the plain form would have to make many samples one by one, it makes all of them better.
  if (!shares || shares.Unfit > ResultWidth / 8) return false;
  Digits = (shares.Used & 0xFF) != 0 ? 3 : (shares.Used & 0xFF00) != 0 ? 2 : 1;

  GroupCount = (ResultWidth + Pixels - 1) / Pixels;
  GroupMemory = NewBuffer(std::size_t(GroupCount + 1) * sizeof(ColumnGroup));
  if (!GroupMemory) return false;
  Groups = reinterpret_cast<ColumnGroup*>(Aligned(GroupMemory));
  std::size_t steps = 0;
  for (std::int32_t g = 0; g < GroupCount; ++g) steps += std::size_t(maker.PlaceGroup(Groups[g], g));
  WeightMemory = NewBuffer((steps + 1) * std::size_t(Digits) * VectorBytes);
  if (!WeightMemory) return false;
  auto* weights = reinterpret_cast<std::int8_t*>(Aligned(WeightMemory));
  const std::int32_t* lineShares = shares.Entries();
  for (std::int32_t g = 0; g < GroupCount; ++g) {
    ColumnGroup& group = Groups[g];
    group.Weights = weights;
    for (std::int32_t p = 0; p < group.Columns; ++p) {
      const std::int32_t x = group.FirstColumn + p;
      maker.FillWeights(weights, p, Table[x], lineShares);
      lineShares += Table[x].Count;
      for (int lane = p * Pair.Channels; lane < (p + 1) * Pair.Channels; ++lane) {
        group.Bias[lane] = shares.Line(x).Bias;
        group.Doubtful[lane] = shares.Line(x).Doubtful;
        if (!shares.Fits(x)) group.AlwaysDoubtful |= 1U << lane;
      }
    }
    weights += std::ptrdiff_t{group.Steps} * Digits * VectorBytes;
  }
  return true;
}

}
