#include <cstdlib>

#include "filters/filters.h"
#include "filters/packed_rows.h"

namespace zor {

// A pixel is read and written before the next is looked for, so what the source shows meanwhile is told by
// the order alone. The time goes into `rand`.
PictureZOR* DiffuseFilter(PictureZOR* self, PictureZOR* dest, Integer level) {
  return RunFilter(self, dest, {.Groups = FilterRules::GrayAndRGB}, [&](const FilterCall& call) {
    const std::int64_t width = call.Source.Width, height = call.Source.Height;
    const std::int64_t reach = std::max(level, 0);
    const std::uint32_t choices = 2 * std::uint32_t(reach) + 1;
    const auto near = [&](std::int64_t place, std::int64_t count) {
      return std::clamp<std::int64_t>(place + std::uint32_t(std::rand()) % choices - reach, 0, count - 1);
    };
    bool reached = true;
    ForPlaneCount(call.In.Count, [&](auto n) {
      for (std::int32_t y = 0; reached && y < height; ++y)
        for (std::int32_t x = 0; reached && x < width; ++x) {
          Sample pixel[n];
          const std::int64_t fromX = near(x, width), fromY = near(y, height);
          reached = WithRow(call.Source, std::int32_t(fromY),
                            [&](Sample* row) {
                              const PlaneRow<n> in(row, call.In);
                              for (int c = 0; c < n; ++c) pixel[c] = in(c, std::ptrdiff_t(fromX));
                            }) &&
                    WithRow(call.Dest, y, [&](Sample* row) {
                      const PlaneRow<n> out(row, call.Out);
                      for (int c = 0; c < n; ++c) out(c, x) = pixel[c];
                    });
        }
    });
    return reached;
  });
}

}
