#pragma once
#include <functional>
#include <initializer_list>
#include <optional>

#include "support/every_store.h"
#include "support/every_target.h"

namespace picturezor {

/// A picture as its planes, in the order of its group, each by itself: what a plain model of a filter works
/// on.
struct Planar {
  int Width, Height, Count;
  Samples Of;
  /// Of planes that were taken from a picture.
  std::vector<Plane> Names;

  Planar(int width, int height, int count)
      : Width(width), Height(height), Count(count), Of(std::size_t(width * height * count)) {}
  std::uint8_t& operator()(int c, int x, int y) { return Of[std::size_t((c * Height + y) * Width + x)]; }
  std::uint8_t operator()(int c, int x, int y) const { return Of[std::size_t((c * Height + y) * Width + x)]; }
  /// With the nearest row and column for those outside.
  std::uint8_t Near(int c, int x, int y) const {
    return (*this)(c, std::clamp(x, 0, Width - 1), std::clamp(y, 0, Height - 1));
  }
};

/// The top left width x height pixels of a picture.
Planar PlanesIn(const Picture& picture, int width, int height);

/// A filter with its arguments, and what it should do: write the samples of `dest`, one after the other,
/// which may have one plane more. With a filter that reads what it has written both are the same object.
struct AreaFilter {
  std::function<Picture(const Picture& source, const Picture& dest)> Run;
  std::function<void(const Planar& source, Planar& dest)> Model;
  bool ServesCMYK = true;
  /// Where `dest` is the source, or shares samples with it.
  enum { Refused, SameResult, ReadsWhatItWrote } InPlace = SameResult;
  /// Whether pixels of another size can be written.
  bool AnyPixelSize = true;
};

/// Compares a filter with its model on noise: in all formats that it serves and on every store, into new
/// pictures, larger ones with another order of planes, and the source itself.
void ExpectLikeModel(const AreaFilter& filter, std::initializer_list<std::pair<int, int>> sizes);

/// Compares a filter with its model on noise for every instruction set.
void ExpectLikeModelOnEveryTarget(const AreaFilter& filter, Format format,
                                  std::initializer_list<std::pair<int, int>> sizes);

/// Runs a filter that has nothing to write on `source`, of the RGB family: any usable `dest` comes back as it
/// was, though it be the source, or too small, or without the planes.
void ExpectUntouched(const Picture& source,
                     const std::function<Picture(const Picture& source, const Picture& dest)>& run);

/// A filter of single samples: what becomes of the sample v of a plane at column x and row y, nothing where
/// the filter leaves it alone; and whether it serves CMYK.
struct PointFilter {
  std::function<Picture(const Picture& source, const Picture& dest)> Run;
  std::function<std::optional<std::uint8_t>(Plane plane, std::uint8_t v, int x, int y)> Wanted;
  bool ServesCMYK = false;
};

/// Stored rows of a picture with these planes in its top left.
std::vector<Samples> With(std::vector<Samples> rows, const Picture& picture, const Planar& planes);

/// The rows that the destination must hold: its own but for the samples that the filter writes.
std::vector<Samples> WantedRows(const PointFilter& filter, const Picture& source, const Picture& dest);

/// Holds a filter against what is known of it, byte by byte: all formats, stores and targets, widths around
/// those of vectors, into a new picture, in place, into larger pictures of another order of planes.
void ExpectPointFilter(const PointFilter& filter);

}
