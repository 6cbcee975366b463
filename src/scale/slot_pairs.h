// How the numbers of a slot lie, and sums of them; for slot_loops_body.h.

namespace zor {
// Of each instruction set its own. NOLINTNEXTLINE(cert-dcl59-cpp,google-build-namespaces)
namespace {

#ifdef WIDE

// An instruction multiplies numbers by twos and adds the two products, so the numbers of a sample lie side by
// side.

LOOP_INLINE int PlaceOf(int sample) {
  return sample % 16 / 4 * (Width / 2) + sample / 16 * 8 + sample % 4 * 2;
}
LOOP_INLINE int SampleIn(const Sample* unit, int sample, int line) {
  std::int16_t number;
  std::memcpy(&number, unit + (PlaceOf(sample) + line) * int(sizeof number), sizeof number);
  return number;
}
LOOP_INLINE void StoreWidened(Bytes even, Bytes odd, Sample* unit) {
  const Bytes low = LowInterleaved(even, odd), high = HighInterleaved(even, odd), zero{};
  Store(unit, LowInterleaved(low, zero));
  Store(unit + Width, HighInterleaved(low, zero));
  Store(unit + Width * 2, LowInterleaved(high, zero));
  Store(unit + Width * 3, HighInterleaved(high, zero));
}
LOOP_INLINE Bytes Narrowed(const Sample* unit, int line) {
  Sums of[4];
  for (int k = 0; k < 4; ++k) {
    of[k] = Load<Sums>(unit + k * Width);
    of[k] = line == 0 ? of[k] & 0xFFFF : of[k] >> 16;
  }
  return Packed(Saturated(of[0], of[1]), Saturated(of[2], of[3]));
}
LOOP_INLINE Numbers DigitsOf(const std::int16_t* two) {
  std::int32_t both;
  std::memcpy(&both, two, sizeof both);
  return Numbers(Sums{} + both);
}
LOOP_INLINE void AddProducts(Sums* sums, const Sample* unit, Numbers digits) {
  UNROLL
  for (int k = 0; k < 4; ++k) {
    const auto numbers = Load<Register>(unit + k * Width);
#ifdef VNNI
    sums[k] = Sums(_mm512_dpwssd_epi32(Register(sums[k]), numbers, Register(digits)));
#else
    sums[k] += Sums(WIDE(madd_epi16)(numbers, Register(digits)));
#endif
  }
}

/// The sums of one sample with either digit.
struct SampleSums {
  __m128i Of = _mm_setzero_si128();
  LOOP_INLINE void Add(const Sample* unit, int sample, const SlotLine::Digits& digits) {
    std::int32_t two;
    std::memcpy(&two, unit + PlaceOf(sample) * int(sizeof(std::int16_t)), sizeof two);
    const __m128i all = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(&digits));
    Of = _mm_add_epi32(Of, _mm_madd_epi16(_mm_set1_epi32(two), all));
  }
  LOOP_INLINE std::int32_t High() const { return _mm_cvtsi128_si32(Of); }
  LOOP_INLINE std::int32_t Low() const { return _mm_cvtsi128_si32(_mm_srli_si128(Of, 4)); }
};

#else

// Elsewhere half a unit has the numbers of its even line first, then those of the odd one.

LOOP_INLINE int SampleIn(const Sample* unit, int sample, int line) {
  std::int16_t number;
  std::memcpy(&number, unit + (sample / 8 * 16 + line * 8 + sample % 8) * int(sizeof number), sizeof number);
  return number;
}
#ifdef __ARM_NEON
LOOP_INLINE void StoreWidened(const Bytes& even, const Bytes& odd, Sample* unit) {
  Store(unit, vmovl_u8(vget_low_u8(uint8x16_t(even))));
  Store(unit + Width, vmovl_u8(vget_low_u8(uint8x16_t(odd))));
  Store(unit + Width * 2, vmovl_u8(vget_high_u8(uint8x16_t(even))));
  Store(unit + Width * 3, vmovl_u8(vget_high_u8(uint8x16_t(odd))));
}
LOOP_INLINE int16x4_t DigitsOf(const std::int16_t* two) {
  std::int32_t both;
  std::memcpy(&both, two, sizeof both);
  return vreinterpret_s16_s32(vdup_n_s32(both));
}
template <int Line>
LOOP_INLINE void AddLine(Sums* sums, const Sample* unit, int16x4_t digits) {
  UNROLL
  for (int half = 0; half < 2; ++half) {
    const auto numbers = Load<int16x8_t>(unit + (half * 2 + Line) * Width);
    sums[half * 2] = Sums(vmlal_lane_s16(int32x4_t(sums[half * 2]), vget_low_s16(numbers), digits, Line));
    sums[half * 2 + 1] =
        Sums(vmlal_lane_s16(int32x4_t(sums[half * 2 + 1]), vget_high_s16(numbers), digits, Line));
  }
}
LOOP_INLINE void AddProducts(Sums* sums, const Sample* unit, int16x4_t digits) {
  AddLine<0>(sums, unit, digits);
  AddLine<1>(sums, unit, digits);
}
#else
using HalfBytes [[gnu::vector_size(8)]] = std::uint8_t;
using HalfNumbers [[gnu::vector_size(8)]] = std::int16_t;
LOOP_INLINE void StoreWidened(const Bytes& even, const Bytes& odd, Sample* unit) {
  for (int half = 0; half < 2; ++half)
    for (int line = 0; line < 2; ++line) {
      const auto* bytes = reinterpret_cast<const Sample*>(line == 0 ? &even : &odd) + half * 8;
      Store(unit + (half * 2 + line) * Width, __builtin_convertvector(Load<HalfBytes>(bytes), Numbers));
    }
}
LOOP_INLINE const std::int16_t* DigitsOf(const std::int16_t* two) { return two; }
LOOP_INLINE void AddProducts(Sums* sums, const Sample* unit, const std::int16_t* digits) {
  for (int k = 0; k < 4; ++k)
    for (int line = 0; line < 2; ++line) {
      const auto numbers = Load<HalfNumbers>(unit + (k / 2 * 2 + line) * Width + k % 2 * 8);
      sums[k] += __builtin_convertvector(numbers, Sums) * std::int32_t{digits[line]};
    }
}
#endif
LOOP_INLINE Bytes Narrowed(const Sample* unit, int line) {
  return Packed(Load<Numbers>(unit + line * Width), Load<Numbers>(unit + (2 + line) * Width));
}

/// The sums of one sample with either digit.
struct SampleSums {
  std::int32_t Of[2] = {};
  LOOP_INLINE void Add(const Sample* unit, int sample, const SlotLine::Digits& digits) {
    const std::int32_t even = SampleIn(unit, sample, 0), odd = SampleIn(unit, sample, 1);
    Of[0] += even * digits.High[0] + odd * digits.High[1];
    Of[1] += even * digits.Low[0] + odd * digits.Low[1];
  }
  LOOP_INLINE std::int32_t High() const { return Of[0]; }
  LOOP_INLINE std::int32_t Low() const { return Of[1]; }
};

#endif

}
}
