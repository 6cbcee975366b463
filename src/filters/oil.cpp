#include "filters/filters.h"
#include "filters/oil_rows.h"
#include "image/walk.h"

namespace zor {
namespace {

/// The samples of one class in a neighbourhood.
struct Class {
  std::int64_t Count, Sum;
};

/// The mean of the class with the most samples, the lowest of them on a tie.
Sample MeanOfMost(const Class* classes, std::int32_t levels) {
  const Class* best = classes;
  for (std::int32_t j = 1; j < levels; ++j)
    if (classes[j].Count > best->Count) best = &classes[j];
  return Sample(best->Sum / best->Count);
}

/// One pixel after the other, each reading what those before it have left.
bool OilPixels(const FilterCall& call, std::int32_t levels, std::int64_t range) {
  const std::int64_t width = call.Source.Width, height = call.Source.Height;
  bool reached = true;
  ForPlaneCount(call.In.Count, [&](auto n) {
    Class classes[n][256];
    for (std::int64_t y = 0; reached && y < height; ++y)
      for (std::int64_t x = 0; reached && x < width; ++x) {
        for (auto& plane : classes) std::fill_n(plane, levels, Class{});
        const std::int64_t bottom = std::min(y + range, height - 1), right = std::min(x + range, width - 1);
        for (std::int64_t row = std::max<std::int64_t>(y - range, 0); reached && row <= bottom; ++row)
          reached = WithRow(call.Source, std::int32_t(row), [&](Sample* samples) {
            const PlaneRow<n> in(samples, call.In);
            for (std::int64_t column = std::max<std::int64_t>(x - range, 0); column <= right; ++column)
              for (int c = 0; c < n; ++c) {
                const std::int32_t sample = in(c, std::ptrdiff_t(column));
                Class& of = classes[c][levels * sample / 256];
                ++of.Count;
                of.Sum += sample;
              }
          });
        reached = reached && WithRow(call.Dest, std::int32_t(y), [&](Sample* samples) {
                    const PlaneRow<n> out(samples, call.Out);
                    for (int c = 0; c < n; ++c) out(c, std::ptrdiff_t(x)) = MeanOfMost(classes[c], levels);
                  });
      }
  });
  return reached;
}

bool Oil(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  if (!call.SharesPixels)
    if (const auto reached = range <= NearRange ? OilNear(call, levels, range) : OilFar(call, levels, range))
      return *reached;
  return OilPixels(call, levels, range);
}

}

PictureZOR* OilFilter(PictureZOR* self, PictureZOR* dest, Integer levels, Integer range) {
  return RunFilter(self, dest, {.SamePixelSize = true}, [&](const FilterCall& call) {
    return Oil(call, std::clamp(levels, 1, 256), std::max(range, 0));
  });
}

}
