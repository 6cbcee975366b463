#pragma once
#include <cstdint>
#include <span>
#include <vector>

#include "object_model.h"
#include "picturezor/host_picture.h"

// As much of QuickDraw as the module asks for: GWorlds in memory.

namespace picturezor::model::quickdraw {

/// Pixels of 8, 16, 24 or 32 bits. 16 are 1, 5, 5, 5 bits, the byte with red first; 24 may take 4 bytes.
struct PixMap {
  std::int32_t Width, Height, Depth, PixelBytes, RowBytes;
  int Locks = 0;
  std::vector<std::uint8_t> Pixels;

  PixMap(std::int32_t width, std::int32_t height, std::int32_t depth, std::int32_t pixelBytes,
         std::int32_t rowBytes);
  std::uint8_t* Row(std::int32_t y) { return Pixels.data() + std::ptrdiff_t{y} * RowBytes; }
};

/// A port with pixels of its own.
struct GWorld {
  PixMap Map;

  template <class... Arguments>
  explicit GWorld(Arguments... arguments) : Map(arguments...) {
    ++TheRuntime().Alive.GWorlds;
  }
  GWorld(const GWorld&) = delete;
  ~GWorld();
};

Color ReadPixel(const std::uint8_t* pixel, std::int32_t depth, std::int32_t pixelBytes);
/// Leaves the byte in front of the colours alone.
void WritePixel(std::uint8_t* pixel, std::int32_t depth, std::int32_t pixelBytes, Color color);

/// The GWorld that an instance of GWorldZOR holds; null for none.
GWorld* OfInstance(void* instance);
/// The destructor of that class.
void DisposeOfInstance(void* instance);

/// Whether a service may do its work, which it tells first.
bool Asked(const char* service);

std::span<const Service> Services();

}
