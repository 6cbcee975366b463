#pragma once
#include <functional>
#include <initializer_list>

#include "support/every_store.h"

namespace picturezor {

/// A picture as its planes, in the order of its group, each by itself: what a plain model of a filter works
/// on.
struct Planar {
  int Width, Height, Count;
  Samples Of;

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

/// A filter with its arguments, and what it should do: write the samples of `dest`, one after the other. With
/// a filter that reads what it has written both are the same object.
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

/// Runs a filter that has nothing to write on `source`, of the RGB family: any usable `dest` comes back as it
/// was, though it be the source, or too small, or without the planes.
void ExpectUntouched(const Picture& source,
                     const std::function<Picture(const Picture& source, const Picture& dest)>& run);

/// Compares a filter with its model on noise for every instruction set.
void ExpectLikeModelOnEveryTarget(const AreaFilter& filter, Format format,
                                  std::initializer_list<std::pair<int, int>> sizes);

}
