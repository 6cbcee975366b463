#include <algorithm>

#include "filters/dither_matrices.h"
#include "filters/filters.h"
#include "filters/plane_tables.h"
#include "image/walk.h"

namespace zor {
namespace {

/// What becomes of a sample: the level above it where the threshold lies below its rest, else the level at or
/// below it.
struct DitherTables {
  SampleTable Below, Above, Rest;

  DitherTables(int side, int levels) {
    const auto level = [=](int i) { return Sample(255 * i / (levels - 1)); };
    for (int v = 0; v < 256; ++v) {
      const int quotient = (levels - 1) * v / 256;
      Below[v] = level(quotient);
      Above[v] = level(quotient + 1);
      // At most 255, with the largest side of 16.
      Rest[v] = Sample((side * side + 1) * v / 256);
    }
  }
  Sample operator()(Sample v, Sample threshold) const { return threshold < Rest[v] ? Above[v] : Below[v]; }
};

}

PictureZOR* DitherFilter(PictureZOR* self, PictureZOR* dest, Integer matrix, Integer levels) {
  return RunFilter(self, dest, {.Groups = FilterRules::GrayAndRGB}, [&](const FilterCall& call) {
    const DitherMatrix* thresholds = MatrixOf(matrix);
    if (!thresholds) return true;
    const int side = thresholds->Side;
    const DitherTables dithered(side, std::clamp(levels, 2, 256));
    bool done = true;
    ForPlaneCount(call.In.Count, [&](auto n) {
      done = Walk(From(call.Source), Into(call.Dest))
                 .Rows(call.Source.Height, [&](std::int32_t y, Sample* source, Sample* into) {
                   const PlaneRow<n> in(source, call.In), out(into, call.Out);
                   const Sample* cells = thresholds->Cells + y % side * side;
                   for (std::ptrdiff_t x = 0; x < call.Source.Width; ++x)
                     for (int c = 0; c < n; ++c) out(c, x) = dithered(in(c, x), cells[x % side]);
                 });
    });
    return done;
  });
}

}
