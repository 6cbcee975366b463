#pragma once
#include "image/clip.h"
#include "image/filter.h"

namespace zor {

/// A table for each plane; null leaves that plane of the destination alone.
struct PlaneTables {
  const SampleTable* Gray = nullptr;
  const SampleTable *Red = nullptr, *Green = nullptr, *Blue = nullptr;
  const SampleTable *Cyan = nullptr, *Magenta = nullptr, *Yellow = nullptr, *Black = nullptr;
  const SampleTable* Alpha = nullptr;
};

/// One table for all planes, alpha included.
inline PlaneTables EveryPlane(const SampleTable& t) { return {&t, &t, &t, &t, &t, &t, &t, &t, &t}; }

/// Sends every sample of the source through the table of its plane, into the same place of the destination.
/// False when a row can't be reached; the rows above it are done.
bool MapPlanes(const FilterCall& call, const PlaneTables& tables);
/// The same in place, in the bounds of a rectangle that lies in the picture.
bool MapPlanes(PictureData& picture, const Rectangle& part, const PlaneTables& tables);

}
