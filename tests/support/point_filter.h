#pragma once
#include <functional>
#include <optional>

#include "support/every_store.h"
#include "support/every_target.h"

namespace picturezor {

enum class Plane { Gray, Red, Green, Blue, Cyan, Magenta, Yellow, Black, Alpha };

/// The planes of a picture's group, and where they stand in its rows.
struct PlacedPlane {
  Plane Of;
  int Offset;
};
std::vector<PlacedPlane> PlanesOf(const Picture& picture);

/// A filter as it is called, and what is known of it: what becomes of the sample v of a plane at column x and
/// row y, nothing where the filter leaves it alone; and whether it serves CMYK.
struct PointFilter {
  std::function<Picture(const Picture& source, const Picture& dest)> Run;
  std::function<std::optional<std::uint8_t>(Plane plane, std::uint8_t v, int x, int y)> Wanted;
  bool ServesCMYK = false;
};

/// The rows that the destination must hold: `before` but for the samples that the filter writes.
std::vector<Samples> WantedRows(const PointFilter& filter, const Picture& source, const Picture& dest,
                                std::vector<Samples> before);

/// Holds a filter against what is known of it, byte by byte: all formats, stores and targets, widths around
/// those of vectors, into a new picture, in place, into larger pictures of another order of planes.
void ExpectPointFilter(const PointFilter& filter);

}
