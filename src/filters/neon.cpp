#include <cmath>

#include "filters/filters.h"
#include "filters/packed_rows.h"
#include "image/targets.h"

namespace zor {
namespace {

/// `pixel` samples from a sample to its right neighbour.
void EdgeStrengths(const Sample* row, const Sample* below, Sample* out, std::ptrdiff_t count,
                   std::ptrdiff_t pixel) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const std::int32_t down = row[i] - below[i], across = row[i] - row[i + pixel];
    // A root below a whole number is at least 1 / 1020 below it here, more than a float rounds away.
    const std::int32_t root = std::int32_t(std::sqrt(float(2 * (down * down + across * across))));
    out[i] = Sample(root > 255 ? 255 : root);
  }
}

/// What stands in a row behind its last pixel, in the place of plane c: a neighbour's sample on a clip view,
/// padding, or nothing, which counts as 0.
Sample Behind(const PictureData& picture, const Sample* row, const PlaneList& planes, int c) {
  const std::int64_t place = PackedRowBytes(picture) + planes.Offset[c];
  return place < picture.RowSize ? row[place] : 0;
}

}

PictureZOR* NeonFilter(PictureZOR* self, PictureZOR* dest) {
  return RunFilter(self, dest, {}, [&](const FilterCall& call) {
    const PackedRows packing(call);
    const std::int32_t height = call.Source.Height;
    const std::ptrdiff_t samples = packing.Samples(), pixel = packing.Count();
    const std::size_t bytes = std::size_t(samples) + std::size_t(pixel);
    Buffer current = NewBuffer(bytes), next = NewBuffer(bytes);
    const Buffer result = NewBuffer(bytes);
    const auto load = [&](std::int32_t y, Sample* into) {
      return WithRow(call.Source, y, [&](Sample* row) {
        packing.Load(row, into);
        for (int c = 0; c < pixel; ++c)
          into[samples + c] = Behind(call.Source, row, packing.SourcePlanes(), c);
      });
    };
    if (!current || !next || !result) return true;
    bool reached = load(0, current.get());
    for (std::int32_t y = 0; reached && y < height; ++y) {
      if (y + 1 < height)
        reached = load(y + 1, next.get());
      else
        std::fill_n(next.get(), bytes, Sample{0});
      reached = reached && WithRow(call.Dest, y, [&](Sample* row) {
                  packing.Write(row, result.get(), [&](Sample* out) {
                    OnBestTarget<EdgeStrengths>(static_cast<const Sample*>(current.get()),
                                                static_cast<const Sample*>(next.get()), out, samples, pixel);
                  });
                });
      current.swap(next);
    }
    return reached;
  });
}

}
