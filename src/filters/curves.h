#pragma once
#include <optional>

#include "filters/plane_tables.h"

namespace zor {

/// How a filter's tables come about: a curve for each colour, of which a gray picture takes that of green,
/// and one for alpha, which isn't written without.
template <class Curve>
struct Curves {
  Curve Red, Green, Blue;
  std::optional<Curve> Alpha;
};

/// Maps a gray or RGB picture by the tables of curves, made in their order; equal ones share theirs.
template <class Curve>
PictureZOR* MapCurves(PictureZOR* self, PictureZOR* dest, SampleTable (*tableOf)(Curve),
                      const Curves<Curve>& curves) {
  const FilterRules rules{.Groups = FilterRules::GrayAndRGB, .WritesAlpha = curves.Alpha.has_value()};
  return RunFilter(self, dest, rules, [&](const FilterCall& call) {
    const auto& [red, green, blue, alpha] = curves;
    SampleTable made[4];
    made[0] = tableOf(red);
    const SampleTable* const r = &made[0];
    const SampleTable* const g = green == red ? r : &(made[1] = tableOf(green));
    const SampleTable* const b = blue == green ? g : blue == red ? r : &(made[2] = tableOf(blue));
    const SampleTable* const a = alpha ? &(made[3] = tableOf(*alpha)) : nullptr;
    return MapPlanes(call, {.Gray = g, .Red = r, .Green = g, .Blue = b, .Alpha = a});
  });
}

}
