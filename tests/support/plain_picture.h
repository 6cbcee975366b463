#pragma once
#include <string>

#include "support/every_store.h"

namespace picturezor {

/// A copy of a picture's pixels that is worked on sample by sample: what the fast forms are held against.
struct PlainPicture {
  explicit PlainPicture(const Picture& picture);

  bool Has(char plane) const { return Layout.find(plane) != std::string::npos; }
  /// 'g', 'R' or 'C'; 0 for none.
  char Family() const { return Has('g') ? 'g' : Has('R') ? 'R' : Has('C') ? 'C' : 0; }
  /// Its planes without alpha.
  std::string Colours() const;
  std::uint8_t& At(int x, int y, char plane) {
    return Pixels[std::size_t(y * Width + x) * Layout.size() + Layout.find(plane)];
  }
  int At(int x, int y, char plane) const { return const_cast<PlainPicture*>(this)->At(x, y, plane); }
  bool Inside(std::int64_t x, std::int64_t y) const { return x >= 0 && y >= 0 && x < Width && y < Height; }
  /// Gray as it is, or the luma of red, green and blue.
  int Gray(int x, int y) const;

  int Width, Height;
  std::string Layout;
  Samples Pixels;
};

/// The stores for one of many cases: all of them for some, memory for the rest, since each takes a file.
template <class Body>
void ForStores(bool all, int width, int height, Format format, Body&& body) {
  if (all)
    ForEveryStore(width, height, format, body);
  else
    body(Picture(width, height, format));
}

/// A rectangle near a picture of that size, any of its edges outside at times, and negative sizes.
Rect AnyRect(Noise& noise, int width, int height);

/// Calls body(x, y) for each pixel of the rectangle that lies in the picture, in their order.
template <class Body>
void ForPixels(const PlainPicture& picture, const Rect& rect, Body&& body) {
  const std::int64_t left = std::min<std::int64_t>(rect.X, std::int64_t{rect.X} + rect.Width),
                     top = std::min<std::int64_t>(rect.Y, std::int64_t{rect.Y} + rect.Height);
  const std::int64_t right = left + std::abs(std::int64_t{rect.Width}),
                     bottom = top + std::abs(std::int64_t{rect.Height});
  for (int y = 0; y < picture.Height; ++y)
    for (int x = 0; x < picture.Width; ++x)
      if (x >= left && x < right && y >= top && y < bottom) body(x, y);
}

/// The same for a block that goes from one picture into another: body(x, y, source x, source y).
template <class Body>
void ForPixels(const PlainPicture& dest, const PlainPicture& source, Rect rect, int sourceX, int sourceY,
               Body&& body) {
  const auto pull = [](std::int32_t& at, std::int32_t& size, int& from) {
    if (from >= 0) return;
    at += from;
    size += from;
    from = 0;
  };
  pull(rect.X, rect.Width, sourceX);
  pull(rect.Y, rect.Height, sourceY);
  const int left = std::min(rect.X, rect.X + rect.Width), top = std::min(rect.Y, rect.Y + rect.Height);
  ForPixels(dest, rect, [&](int x, int y) {
    const int fromX = sourceX + x - left, fromY = sourceY + y - top;
    if (source.Inside(fromX, fromY)) body(x, y, fromX, fromY);
  });
}

}
