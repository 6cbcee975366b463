#include <optional>

#include "filters/filters.h"
#include "filters/packed_rows.h"
#include "image/arithmetic.h"
#include "image/targets.h"

namespace zor {
namespace {

std::int32_t Displaced(std::int32_t place, std::int32_t level, std::int32_t count) {
  return std::int32_t(std::clamp<std::int64_t>(std::int64_t{place} + level, 0, count - 1));
}

void Differences(const Sample* row, const Sample* other, Sample* out, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) out[i] = Clamp(row[i] - other[i] + 128);
}

/// The displaced row comes with its ends repeated, so that it can be read `shift` samples further on. False
/// when a row can't be reached; without memory nothing, and nothing is done.
std::optional<bool> EngraveRows(const FilterCall& call, std::int32_t level) {
  const PackedRows packing(call);
  const std::int32_t width = call.Source.Width, height = call.Source.Height, pixel = packing.Count();
  // From the width on every pixel looks at an end.
  const std::ptrdiff_t shift = std::ptrdiff_t{std::clamp(level, -width, width)} * pixel;
  const std::ptrdiff_t samples = packing.Samples();
  const Buffer row = NewBuffer(std::size_t(samples)), result = NewBuffer(std::size_t(samples)),
               other = NewBuffer(samples, 3);
  if (!row || !result || !other) return std::nullopt;
  bool reached = true;
  Sample* const first = other.get() + samples;
  for (std::int32_t y = 0; reached && y < height; ++y)
    reached = WithRow(call.Source, y, [&](Sample* source) { packing.Load(source, row.get()); }) &&
              WithRow(call.Source, Displaced(y, level, height),
                      [&](Sample* source) { packing.Load(source, first); }) &&
              WithRow(call.Dest, y, [&](Sample* dest) {
                for (std::ptrdiff_t i = samples; i < samples + shift; i += pixel)
                  std::copy_n(first + samples - pixel, pixel, first + i);
                for (std::ptrdiff_t i = -pixel; i >= shift; i -= pixel) std::copy_n(first, pixel, first + i);
                packing.Write(dest, result.get(), [&](Sample* out) {
                  OnBestTarget<Differences>(static_cast<const Sample*>(row.get()),
                                            static_cast<const Sample*>(first + shift), out, samples);
                });
              });
  return reached;
}

/// One pixel after the other, each reading what those before it have left.
bool EngravePixels(const FilterCall& call, std::int32_t level) {
  const std::int32_t width = call.Source.Width, height = call.Source.Height;
  bool reached = true;
  ForPlaneCount(call.In.Count, [&](auto n) {
    for (std::int32_t y = 0; reached && y < height; ++y)
      for (std::int32_t x = 0; reached && x < width; ++x) {
        int value[n];
        const auto other = Displaced(x, level, width);
        reached = WithRow(call.Source, y,
                          [&](Sample* row) {
                            for (int c = 0; c < n; ++c) value[c] = PlaneRow<n>(row, call.In)(c, x) + 128;
                          }) &&
                  WithRow(call.Source, Displaced(y, level, height),
                          [&](Sample* row) {
                            for (int c = 0; c < n; ++c) value[c] -= PlaneRow<n>(row, call.In)(c, other);
                          }) &&
                  WithRow(call.Dest, y, [&](Sample* row) {
                    for (int c = 0; c < n; ++c) PlaneRow<n>(row, call.Out)(c, x) = Clamp(value[c]);
                  });
      }
  });
  return reached;
}

}

PictureZOR* EngraveFilter(PictureZOR* self, PictureZOR* dest, Integer level) {
  return RunFilter(self, dest, {.Groups = FilterRules::GrayAndRGB}, [&](const FilterCall& call) {
    if (!call.SharesPixels)
      if (const auto reached = EngraveRows(call, level)) return *reached;
    return EngravePixels(call, level);
  });
}

}
